// SPDX-License-Identifier: Apache-2.0

#include "support/fixed_environment.h"
#include "support/sample_message.h"
#include "unit/proof/signed_message.h"

#include <ssoclient/proof/sign_message.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;
using Names = std::vector<std::string>;
using Tarvel::Xml::ElementNode;

const std::string TOKEN_ID = "_cad82194-a358-086b-2329-0b169db56c7a";
const std::string BLOCK = "<a:To xmlns:a=\"urn:a\">you</a:To><a:No xmlns:a=\"urn:a\"></a:No>";

class SignMessageTest : public testing::Test {
protected:
  std::string Sign(const std::string &message, const std::vector<MessagePart> &parts = {},
                   const SecurityHeaderOptions &options = {}) const {
    return SignMessage(message, *m_token, *m_key, parts, options);
  }

  const FixedEnvironment m_environment;
  const std::shared_ptr<const SamlToken> m_token = SampleToken("tokens/holder-of-key");
  const Tarvel::Ref<const Tarvel::Crypto::PrivateKey> m_key = SampleKey("holder");
};

/// The values of the attribute "URI" of the references in the proof signature.
Names ReferencesOf(const std::string &text) {
  const auto document = ParseDocument(text);
  const auto *const signature = FindBelow(*document->GetDocumentNode(), "Security")->FindChildElement("Signature");
  const auto *const signedInfo = signature->FindChildElement("SignedInfo");
  Names references;
  for (const auto *node = signedInfo->GetFirstChild(); node; node = node->GetNextSibling()) {
    if (AsElement(node)->GetLocalName() == "Reference") {
      references.emplace_back(AsElement(node)->FindAttribute("", "URI")->GetValue());
    }
  }
  return references;
}

/// The names of the child elements of the first security header.
Names ChildrenOfSecurity(const std::string &text) {
  const auto document = ParseDocument(text);
  Names names;
  for (const auto *node = FindBelow(*document->GetDocumentNode(), "Security")->GetFirstChild(); node;
       node = node->GetNextSibling()) {
    names.emplace_back(AsElement(node)->GetName());
  }
  return names;
}

TEST_F(SignMessageTest, SignsBodyTimestampAndTokenInBothVersions) {
  for (const std::string &soap : {SOAP11, SOAP12}) {
    for (const std::string &message : {SampleMessage("", soap), SampleEnvelope("<s:Body/>", soap)}) {
      const std::string text = Sign(message);
      EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
      EXPECT_EQ(ChildrenOfSecurity(text), (Names{"wsu:Timestamp", "saml:Assertion", "ds:Signature"}));
      EXPECT_EQ(
          ReferencesOf(text),
          (Names{"#Body00000000-0000-4000-8000-00000000000" + ReferencesOf(text).front().substr(40),
                 "#Timestamp00000000-0000-4000-8000-00000000000" + ReferencesOf(text)[1].substr(45), "#" + TOKEN_ID}));
    }
  }
}

TEST_F(SignMessageTest, SignsTheHeaderBlocksThatAreListed) {
  const std::string text = Sign(SampleMessage(BLOCK), {{"urn:a", "No"}, {"urn:a", "To"}});
  EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "No", "To", "Assertion"}));
  EXPECT_EQ(CoveredBySignature(Sign(SampleMessage(BLOCK), {{"urn:a", "To"}}), *m_token),
            (Names{"Body", "Timestamp", "To", "Assertion"}));
}

TEST_F(SignMessageTest, SignsAsManyHeaderBlocksAsAReceiverAccepts) {
  std::string blocks;
  std::vector<MessagePart> parts;
  for (std::size_t number = 0; number < MAX_SIGNED_PARTS; ++number) {
    const std::string name = "B" + std::to_string(number);
    blocks += "<" + name + "/>";
    parts.push_back({"", name});
  }
  EXPECT_EQ(CoveredBySignature(Sign(SampleMessage(blocks), parts), *m_token).size(), 10u);
}

TEST_F(SignMessageTest, RefersToTheTokenByItsIdentifierInBothSpellings) {
  SecurityHeaderOptions options;
  for (const char *const spelling : {"tokenprofile", "token-profile"}) {
    options.dialect.standardTokenTypeReference = std::string("token-profile") == spelling;
    EXPECT_NE(Sign(SampleMessage(""), {}, options)
                  .find("<ds:KeyInfo><wsse:SecurityTokenReference wsse11:TokenType=\"http://docs.oasis-open.org/wss/"
                        "oasis-wss-saml-" +
                        std::string(spelling) + "-1.1#SAMLV2.0\" xmlns:wsse=\"" + WSSE +
                        "\" xmlns:wsse11=\"http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd\">"
                        "<wsse:KeyIdentifier ValueType=\"http://docs.oasis-open.org/wss/"
                        "oasis-wss-saml-token-profile-1.1#SAMLID\">" +
                        TOKEN_ID + "</wsse:KeyIdentifier></wsse:SecurityTokenReference></ds:KeyInfo></ds:Signature>"),
              std::string::npos);
  }
}

TEST_F(SignMessageTest, KeepsTheIdentifierThatABodyHas) {
  const struct {
    std::string attributes;
    const char *reference;
  } cases[] = {
      {" u:Id=\"a\" Id=\"b\" ID=\"c\" xml:id=\"d\" xmlns:u=\"" + WSU + "\"", "#a"},
      {" Id=\"b\" ID=\"c\" xml:id=\"d\"", "#b"},
      {" ID=\"c\" xml:id=\"d\"", "#c"},
      {" xml:id=\"d\"", "#d"},
  };
  for (const auto &[attributes, reference] : cases) {
    const std::string body = "<s:Body" + attributes + "></s:Body>";
    const std::string text = Sign(SampleEnvelope(body));
    EXPECT_NE(text.find(body), std::string::npos) << text;
    EXPECT_EQ(ReferencesOf(text).front(), reference);
    EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
  }
}

TEST_F(SignMessageTest, GivesABodyAnIdentifierIfItsOwnCannotBeInAReference) {
  for (const std::string attributes : {" Id=\"\"", " ID=\"xpointer(/)\"", " id=\"x\""}) {
    const std::string text = Sign(SampleEnvelope("<s:Body" + attributes + "></s:Body>"));
    EXPECT_NE(text.find("<s:Body" + attributes + " xmlns:wsu=\"" + WSU + "\" wsu:Id=\"Body0000"), std::string::npos);
    EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
  }
}

TEST_F(SignMessageTest, KeepsTheMeaningOfThePrefixesOfTheBody) {
  const std::string other = Sign(SampleEnvelope("<s:Body xmlns:wsu=\"urn:1\"><wsu:x wsu:Id=\"1\"/></s:Body>"));
  EXPECT_NE(other.find("<s:Body xmlns:wsu=\"urn:1\" xmlns:wsu1=\"" + WSU + "\" wsu1:Id=\"Body"), std::string::npos);
  EXPECT_EQ(CoveredBySignature(other, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
  const std::string declared =
      Sign("<s:Envelope xmlns:s=\"" + SOAP11 + "\" xmlns:u=\"" + WSU + "\"><s:Body/></s:Envelope>");
  EXPECT_NE(declared.find("<s:Body u:Id=\"Body"), std::string::npos);
  EXPECT_EQ(CoveredBySignature(declared, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
}

TEST_F(SignMessageTest, WorksInAnEnvelopeThatUsesItsPrefixesForOtherNamespaces) {
  const std::string text =
      Sign("<ds:Envelope xmlns:ds=\"" + SOAP12 +
           "\" xmlns=\"urn:default\" xmlns:wsse=\"urn:1\" xmlns:wsu=\"urn:2\" xmlns:saml=\"urn:3\" "
           "xmlns:wsse11=\"urn:4\"><ds:Body wsu:Id=\"no\"><x/><wsse:y/></ds:Body></ds:Envelope>");
  EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
  EXPECT_NE(text.find("<ds:Body wsu:Id=\"no\" xmlns:wsu1=\""), std::string::npos);
}

TEST_F(SignMessageTest, UsesTheTimestampOfAnExistingHeader) {
  const std::string timestamp = "<u:Timestamp u:Id=\"ts\"><u:Created>2020</u:Created></u:Timestamp>";
  const std::string text = Sign(SampleMessage(SampleSecurity(timestamp + "<o:X></o:X>", " s:mustUnderstand=\"0\"")));
  EXPECT_EQ(ChildrenOfSecurity(text), (Names{"saml:Assertion", "ds:Signature", "u:Timestamp", "o:X"}));
  EXPECT_EQ(ReferencesOf(text)[1], "#ts");
  EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
  EXPECT_NE(text.find(timestamp + "<o:X></o:X></o:Security>"), std::string::npos);
}

TEST_F(SignMessageTest, SignsForARoleAndLeavesTheOtherHeadersAlone) {
  SecurityHeaderOptions options;
  options.role = "urn:r";
  const std::string other = SampleSecurity("<u:Timestamp></u:Timestamp><u:Timestamp></u:Timestamp>");
  const std::string text = Sign(SampleMessage(other), {}, options);
  EXPECT_NE(text.find(other), std::string::npos);
  EXPECT_NE(text.find(" s:actor=\"urn:r\" s:mustUnderstand=\"1\"><wsu:Timestamp"), std::string::npos);
  EXPECT_EQ(CoveredBySignature(text, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
}

TEST_F(SignMessageTest, SignsAMessageThatWasSignedForAnotherRole) {
  SecurityHeaderOptions options;
  options.role = "urn:r";
  const auto other = SampleToken("saml2/holder-rsa-value");
  const std::string first = SignMessage(SampleMessage(""), *other, *m_key, {}, options);
  const std::string second = Sign(first);
  EXPECT_EQ(CoveredBySignature(second, *m_token), (Names{"Body", "Timestamp", "Assertion"}));
  EXPECT_EQ(ReferencesOf(second).front(), ReferencesOf(first).front());
}

TEST_F(SignMessageTest, ChangesAParsedMessageInPlace) {
  const auto document = ParseDocument("<!--c-->" + SampleMessage(BLOCK));
  const auto *const body = document->GetDocumentElement()->FindChildElement("Body");
  SignMessage(*document, *m_token, *m_key, {{"urn:a", "To"}});
  EXPECT_EQ(document->GetDocumentElement()->FindChildElement("Body"), body);
  EXPECT_EQ(CoveredBySignature(WriteElement(*document->GetDocumentElement()), *m_token),
            (Names{"Body", "Timestamp", "To", "Assertion"}));
}

TEST_F(SignMessageTest, KeepsTheTokenAsItWasIssued) {
  for (const char *const name :
       {"tokens/holder-of-key", "saml2/holder-certificate", "saml2/wss4j-holder-certificate"}) {
    const auto token = SampleToken(name);
    const auto document = ParseDocument(SignMessage(SampleMessage(""), *token, *m_key));
    EXPECT_EQ(WriteElement(*FindBelow(*document->GetDocumentNode(), "Assertion")),
              WriteElement(*ParseDocument(token->ToXml())->GetDocumentElement()));
  }
}

TEST_F(SignMessageTest, UsesTheAlgorithmOfTheTokensKey) {
  const struct {
    const char *token;
    const char *key;
    const char *algorithm;
  } cases[] = {
      {"saml2/holder-rsa-value", "holder", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"},
      {"saml2/holder-certificate", "holder", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"},
      {"saml2/wss4j-holder-key-value", "holder", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"},
      {"saml2/holder-ec-value", "sts-ec256", "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256"},
      {"saml2/holder-ec384-value", "sts-ec384", "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha384"},
      {"saml2/holder-ec-certificate", "sts-ec521", "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha512"},
  };
  for (const auto &[name, key, algorithm] : cases) {
    const auto token = SampleToken(name);
    const std::string text = SignMessage(SampleMessage(""), *token, *SampleKey(key));
    EXPECT_EQ(CoveredBySignature(text, *token), (Names{"Body", "Timestamp", "Assertion"})) << name;
    const auto document = ParseDocument(text);
    const auto *const security = FindBelow(*document->GetDocumentNode(), "Security");
    const auto *const method = FindBelow(*security->FindChildElement("Signature"), "SignatureMethod");
    EXPECT_EQ(method->FindAttribute("", "Algorithm")->GetValue(), algorithm) << name;
  }
}

TEST_F(SignMessageTest, SignsABodyCloseToTheLimitOfTheParser) {
  const std::string body = "<s:Body>" + std::string(Tarvel::Xml::MAX_DOCUMENT_BYTES - 16384, 'x') + "</s:Body>";
  EXPECT_EQ(CoveredBySignature(Sign(SampleEnvelope(body)), *m_token), (Names{"Body", "Timestamp", "Assertion"}));
}

TEST_F(SignMessageTest, SignsWhatTheReceiverWillReadWithAnyCharacters) {
  const std::string body =
      "<s:Body a='&#9;&quot;&lt;'>\xC3\xBC\xF0\x9F\x98\x80&#13;\r\n<![CDATA[]]&gt;]]><?p i?><!--c--></s:Body>";
  EXPECT_EQ(
      CoveredBySignature(Sign("<?xml version='1.0'?><!--before-->" + SampleEnvelope(body) + "<!--after-->"), *m_token),
      (Names{"Body", "Timestamp", "Assertion"}));
}

} // namespace
} // namespace SsoClient
