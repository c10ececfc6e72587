// SPDX-License-Identifier: Apache-2.0
// xmlsec1 verifies the requests that we sign, and refuses them after any change.
#include "exchange/request_builder_impl.h"
#include "integration/signed_requests/foreign_document.h"
#include "support/data_file.h"
#include "support/dialect_requests.h"
#include "support/identity.h"
#include "support/token_stand_in.h"

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

/// All signed samples, and an exchange and a renewal of a genuine token.
std::vector<SampleRequest> SignedRequests() {
  std::vector<SampleRequest> samples;
  for (const SampleRequest &sample : SampleRequestsInAllDialects()) {
    if (sample.isSigned) {
      samples.push_back(sample);
    }
  }
  const auto builder = std::make_shared<RequestBuilderImpl>(HolderIdentity());
  const std::string xml = ReadDataFile("tokens/holder-of-key.xml");
  const auto token =
      std::make_shared<TokenStandIn>(AttributeOf(ForeignDocument(xml).Root(), "ID"), xml, SamlToken::HOLDER_OF_KEY);
  samples.push_back({"exchange-of-issued-token", true,
                     [=](Request &r) { builder->BuildExchangeTokenRequest(*token, DelegatedSpec(), r); }});
  samples.push_back({"renew-of-issued-token", true, [=](Request &r) { builder->BuildRenewRequest(*token, 3600, r); }});
  return samples;
}

class SignedEnvelope : public testing::TestWithParam<SampleRequest> {
protected:
  void SetUp() override { GetParam().build(m_request); }

  static xmlNodePtr MessageSignature(const ForeignDocument &document) {
    return Child(Find(document.Root(), "Security"), "Signature");
  }

  /// The certificate to which the signature's key info refers: the certificate in the message, or that of the holder if
  /// the key info refers to an assertion.
  static std::string NamedCertificate(const ForeignDocument &document) {
    const xmlNodePtr keyInfo = Child(MessageSignature(document), "KeyInfo");
    const auto references = FindAll(keyInfo, "Reference");
    if (references.empty()) {
      const std::string assertionId = TextOf(Find(keyInfo, "KeyIdentifier"));
      EXPECT_EQ(assertionId, AttributeOf(Child(Find(document.Root(), "Security"), "Assertion"), "ID"));
      return ReadDataFile("tokens/holder.crt");
    }
    const xmlNodePtr token = Child(Find(document.Root(), "Security"), "BinarySecurityToken");
    EXPECT_EQ(AttributeOf(references.front(), "URI"), "#" + AttributeOf(token, "Id"));
    const std::vector<std::uint8_t> der = Tarvel::StringUtil::Base64Decode(TextOf(token));
    return std::string(der.begin(), der.end());
  }

  /// The elements of WS-Addressing in the header.
  static std::vector<xmlNodePtr> Addressing(const ForeignDocument &document) {
    std::vector<xmlNodePtr> found;
    const xmlNodePtr header = Child(document.Root(), "Header");
    for (xmlNodePtr element = xmlFirstElementChild(header); element; element = xmlNextElementSibling(element)) {
      if (reinterpret_cast<const char *>(element->ns->href) == std::string("http://www.w3.org/2005/08/addressing")) {
        found.push_back(element);
      }
    }
    return found;
  }

  Request m_request;
};

TEST_P(SignedEnvelope, VerifiesWithTheKeyToWhichItsKeyInfoRefers) {
  const ForeignDocument document(m_request.body);
  EXPECT_TRUE(IsValidSignature(MessageSignature(document), NamedCertificate(document))) << m_request.body;
}

TEST_P(SignedEnvelope, VerifiesAfterAnotherEngineReadAndWroteIt) {
  const ForeignDocument document(ForeignDocument(m_request.body).Serialise());
  EXPECT_TRUE(IsValidSignature(MessageSignature(document), NamedCertificate(document)));
}

TEST_P(SignedEnvelope, DoesNotVerifyWithAnotherKey) {
  const ForeignDocument document(m_request.body);
  EXPECT_FALSE(IsValidSignature(MessageSignature(document), ReadDataFile("tokens/other.crt")));
}

TEST_P(SignedEnvelope, SignsTheWholeBodyTheTimestampAndTheAddressingAndNothingElse) {
  const ForeignDocument document(m_request.body);
  std::vector<std::string> uris;
  for (const xmlNodePtr reference : FindAll(Child(MessageSignature(document), "SignedInfo"), "Reference")) {
    uris.push_back(AttributeOf(reference, "URI"));
  }
  std::vector<std::string> expected = {"#" + AttributeOf(Child(document.Root(), "Body"), "Id"),
                                       "#" + AttributeOf(Find(document.Root(), "Timestamp"), "Id")};
  for (const xmlNodePtr element : Addressing(document)) {
    expected.push_back("#" + AttributeOf(element, "Id"));
  }
  EXPECT_EQ(uris, expected);
}

/// One change to one element: its name, its attributes, its text, its children, its place.
struct Change {
  const char *name;
  bool (*apply)(xmlNodePtr element); ///< false when the element has nothing to change in that way
};

const xmlChar *const EXTRA = reinterpret_cast<const xmlChar *>("extra");

const Change CHANGES[] = {
    {"another name",
     [](xmlNodePtr element) {
       xmlNodeSetName(element, EXTRA);
       return true;
     }},
    {"one more attribute", [](xmlNodePtr element) { return xmlNewProp(element, EXTRA, EXTRA) != nullptr; }},
    {"one more child", [](xmlNodePtr element) { return xmlNewChild(element, nullptr, EXTRA, nullptr) != nullptr; }},
    {"one more character",
     [](xmlNodePtr element) {
       xmlNodeAddContent(element, reinterpret_cast<const xmlChar *>(" "));
       return true;
     }},
    {"another attribute value",
     [](xmlNodePtr element) {
       if (!element->properties) {
         return false;
       }
       const std::string value = TextOf(reinterpret_cast<xmlNodePtr>(element->properties)) + "x";
       return xmlSetNsProp(element, element->properties->ns, element->properties->name,
                           reinterpret_cast<const xmlChar *>(value.c_str())) != nullptr;
     }},
    {"an attribute less",
     [](xmlNodePtr element) { return element->properties && xmlRemoveProp(element->properties) == 0; }},
    {"no content",
     [](xmlNodePtr element) {
       if (!element->children || TextOf(element).empty()) {
         return false;
       }
       xmlNodeSetContent(element, nullptr);
       return true;
     }},
    {"another order of children",
     [](xmlNodePtr element) {
       const xmlNodePtr first = xmlFirstElementChild(element);
       const xmlNodePtr second = first ? xmlNextElementSibling(first) : nullptr;
       return second && xmlAddNextSibling(second, first) != nullptr;
     }},
    {"removed",
     [](xmlNodePtr element) {
       xmlUnlinkNode(element);
       xmlFreeNode(element);
       return true;
     }},
};

TEST_P(SignedEnvelope, FailsAfterAnyChangeToAnythingThatIsSigned) {
  const std::string certificate = NamedCertificate(ForeignDocument(m_request.body));
  std::size_t tried = 0;
  std::vector<std::string> parts = {"Body", "Timestamp"};
  const ForeignDocument original(m_request.body);
  for (const xmlNodePtr element : Addressing(original)) {
    parts.emplace_back(reinterpret_cast<const char *>(element->name));
  }
  for (const std::string &part : parts) {
    const std::size_t count = Elements(Find(original.Root(), part)).size();
    for (std::size_t i = 0; i < count; ++i) {
      for (const Change &change : CHANGES) {
        const ForeignDocument document(m_request.body);
        const xmlNodePtr element = Elements(Find(document.Root(), part))[i];
        const std::string name = reinterpret_cast<const char *>(element->name);
        if (!change.apply(element)) {
          continue;
        }
        ++tried;
        const ForeignDocument changed(document.Serialise());
        EXPECT_FALSE(IsValidSignature(MessageSignature(changed), certificate))
            << part << ", element " << i << " (" << name << "): " << change.name;
      }
    }
  }
  EXPECT_GT(tried, 50u);
}

INSTANTIATE_TEST_SUITE_P(EverySignedRequest, SignedEnvelope, testing::ValuesIn(SignedRequests()),
                         [](const auto &sample) { return TestName(sample.param); });

} // namespace
} // namespace SsoClient
