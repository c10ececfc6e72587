// SPDX-License-Identifier: Apache-2.0

#include "compose/message_signing.h"

#include "compose/soap_envelope.h"
#include "compose/ws_security.h"
#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/throws_message.h"
#include "unit/compose/wire_uris.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;
using ElementRef = Tarvel::Ref<Tarvel::Xml::ElementNode>;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::AsText;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::QName;

class SignSoapMessageTest : public testing::Test {
protected:
  ElementRef Sign(const XMLBuilderPtr &header, const XMLBuilderPtr &keyInfo = nullptr) {
    ElementRef envelope;
    SoapBuilder(header, ElementBuilder("wst", "Request"))->build(envelope);
    SignSoapMessage(*m_key, keyInfo, envelope);
    return envelope;
  }

  static const ElementNode *Child(const ElementNode *parent, const std::string &uri, const std::string &name) {
    return parent ? parent->FindChildElement(QName(uri, name)) : nullptr;
  }

  static const ElementNode *Security(const ElementRef &envelope) {
    return Child(Child(envelope.get(), SOAPENV_URI, "Header"), WSSE_URI, "Security");
  }

  static const ElementNode *LastChild(const ElementNode *parent) {
    const ElementNode *last = nullptr;
    for (const auto *node = parent->GetFirstChild(); node; node = node->GetNextSibling()) {
      last = AsElement(node);
    }
    return last;
  }

  static std::string Attribute(const ElementNode *element, const std::string &uri, const std::string &name) {
    const auto *const attribute = element ? element->FindAttribute(uri, name) : nullptr;
    return attribute ? std::string(attribute->GetValue()) : "(none)";
  }

  static std::vector<std::string> ReferenceUris(const ElementNode *signature) {
    std::vector<std::string> uris;
    const ElementNode *const signedInfo = Child(signature, DS_URI, "SignedInfo");
    for (const auto *node = signedInfo->GetFirstChild(); node; node = node->GetNextSibling()) {
      if (AsElement(node) && AsElement(node)->HasQName(DS_URI, "Reference")) {
        uris.push_back(Attribute(AsElement(node), "", "URI"));
      }
    }
    return uris;
  }

  const FixedEnvironment m_environment;
  const Tarvel::Ref<const Tarvel::Crypto::PrivateKey> m_key =
      Tarvel::Crypto::CreatePrivateKey(ReadDataFile("tokens/holder.key"));
};

TEST_F(SignSoapMessageTest, ReferencesTheBodyAndThenTheTimestampByTheirIdentifiers) {
  const ElementRef envelope = Sign(WsSecurityHeaderBuilder(10));
  const ElementNode *const body = Child(envelope.get(), SOAPENV_URI, "Body");
  const ElementNode *const timestamp = Child(Security(envelope), WSU_URI, "Timestamp");
  EXPECT_EQ(Attribute(body, WSU_URI, "Id"), "Body00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(Attribute(timestamp, WSU_URI, "Id"), "Timestamp00000000-0000-4000-8000-000000000002");
  EXPECT_EQ(ReferenceUris(LastChild(Security(envelope))),
            (std::vector<std::string>{"#Body00000000-0000-4000-8000-000000000001",
                                      "#Timestamp00000000-0000-4000-8000-000000000002"}));
}

TEST_F(SignSoapMessageTest, AppendsTheSignatureAsLastChildOfTheSecurityHeader) {
  const XMLCompositePtr header = WsSecurityHeaderBuilder(10);
  header->Add(ElementBuilder("wsse", "Token"));
  const ElementRef envelope = Sign(header);
  const ElementNode *const signature = LastChild(Security(envelope));
  EXPECT_EQ(signature->GetName(), "ds:Signature");
  EXPECT_EQ(signature->GetQName(), QName(DS_URI, "Signature"));
  EXPECT_EQ(Attribute(signature, "", "Id"), "holderOfKeyProofSignature");
}

TEST_F(SignSoapMessageTest, SignsWithExclusiveCanonicalisationAndSha256) {
  const ElementRef envelope = Sign(WsSecurityHeaderBuilder(10));
  const ElementNode *const signedInfo = Child(LastChild(Security(envelope)), DS_URI, "SignedInfo");
  EXPECT_EQ(Attribute(Child(signedInfo, DS_URI, "CanonicalizationMethod"), "", "Algorithm"),
            "http://www.w3.org/2001/10/xml-exc-c14n#");
  EXPECT_EQ(Attribute(Child(signedInfo, DS_URI, "SignatureMethod"), "", "Algorithm"),
            "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256");
  const ElementNode *const reference = Child(signedInfo, DS_URI, "Reference");
  const ElementNode *const transforms = Child(reference, DS_URI, "Transforms");
  EXPECT_EQ(Attribute(Child(transforms, DS_URI, "Transform"), "", "Algorithm"),
            "http://www.w3.org/2001/10/xml-exc-c14n#");
  EXPECT_EQ(transforms->GetFirstChild()->GetNextSibling(), nullptr);
  EXPECT_EQ(Attribute(Child(reference, DS_URI, "DigestMethod"), "", "Algorithm"),
            "http://www.w3.org/2001/04/xmlenc#sha256");
}

TEST_F(SignSoapMessageTest, WritesTheReferenceToTheTokenIntoTheKeyInfo) {
  const ElementRef envelope = Sign(WsSecurityHeaderBuilder(10), WsseX509v3BSTReferenceBuilder("theId"));
  const ElementNode *const keyInfo = Child(LastChild(Security(envelope)), DS_URI, "KeyInfo");
  const ElementNode *const reference = Child(keyInfo, WSSE_URI, "SecurityTokenReference");
  EXPECT_EQ(Attribute(Child(reference, WSSE_URI, "Reference"), "", "URI"), "#theId");
}

TEST_F(SignSoapMessageTest, SignsOnlyTheBodyWhenThereIsNoTimestamp) {
  const ElementRef envelope = Sign(ElementBuilder("wsse", "Security", {{"xmlns:wsse", WSSE_URI}}));
  EXPECT_EQ(ReferenceUris(LastChild(Security(envelope))),
            std::vector<std::string>{"#Body00000000-0000-4000-8000-000000000001"});
}

TEST_F(SignSoapMessageTest, KeepsAndReferencesAnExistingIdentifier) {
  ElementRef envelope;
  SoapBuilder(WsSecurityHeaderBuilder(10), nullptr)->build(envelope);
  ElementNode *const body = envelope->FindChildElement(QName(SOAPENV_URI, "Body"));
  body->DefineAttribute("xmlns:u", WSU_URI);
  body->DefineAttribute("u:Id", "mine");
  SignSoapMessage(*m_key, nullptr, envelope);
  EXPECT_EQ(Attribute(body, WSU_URI, "Id"), "mine");
  EXPECT_EQ(ReferenceUris(LastChild(Security(envelope))),
            (std::vector<std::string>{"#mine", "#Timestamp00000000-0000-4000-8000-000000000001"}));
}

TEST_F(SignSoapMessageTest, IgnoresElementsOfOtherNamespaces) {
  const XMLAttributes decoys = {{"xmlns:d", "urn:decoys"}};
  const auto security =
      std::make_shared<XMLCompositeBuilder>(ElementBuilder("wsse", "Security", {{"xmlns:wsse", WSSE_URI}}));
  security->Add(ElementBuilder("d", "Timestamp", decoys)).Add(WssuTimestampBuilder(10));
  const auto header = std::make_shared<XMLCompositeBuilder>(ElementBuilder("soapenv", "Header"));
  header->Add(ElementBuilder("d", "Security", decoys)).Add(security);
  const auto message =
      std::make_shared<XMLCompositeBuilder>(ElementBuilder("soapenv", "Envelope", {{"xmlns:soapenv", SOAPENV_URI}}));
  message->Add(ElementBuilder("d", "Header", decoys)).Add(ElementBuilder("d", "Body", decoys));
  message->Add(header).Add(ElementBuilder("soapenv", "Body"));
  ElementRef envelope;
  message->build(envelope);

  SignSoapMessage(*m_key, nullptr, envelope);
  EXPECT_EQ(Attribute(Child(envelope.get(), SOAPENV_URI, "Body"), WSU_URI, "Id"),
            "Body00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(Attribute(Child(Security(envelope), WSU_URI, "Timestamp"), WSU_URI, "Id"),
            "Timestamp00000000-0000-4000-8000-000000000002");
  EXPECT_EQ(LastChild(Security(envelope))->GetName(), "ds:Signature");
  EXPECT_EQ(ReferenceUris(LastChild(Security(envelope))).size(), 2u);
}

TEST_F(SignSoapMessageTest, RefusesAMessageWithoutTheElementsThatASignatureNeeds) {
  EXPECT_THROWS_MESSAGE(Sign(nullptr), Tarvel::InvalidArgumentException,
                        "Invalid argument : the message to sign has no element 'Security' in 'soapenv:Header'");
  ElementRef envelope;
  ElementBuilder("soapenv", "Envelope", {{"xmlns:soapenv", SOAPENV_URI}})->build(envelope);
  EXPECT_THROWS_MESSAGE(SignSoapMessage(*m_key, nullptr, envelope), Tarvel::InvalidArgumentException,
                        "Invalid argument : the message to sign has no element 'Body' in 'soapenv:Envelope'");
  BuildAndAppendChildTo(envelope.get(), ElementBuilder("soapenv", "Body"));
  EXPECT_THROWS_MESSAGE(SignSoapMessage(*m_key, nullptr, envelope), Tarvel::InvalidArgumentException,
                        "Invalid argument : the message to sign has no element 'Header' in 'soapenv:Envelope'");
}

TEST_F(SignSoapMessageTest, PassesOnTheExceptionOfAKeyThatCannotSign) {
  ElementRef envelope;
  SoapBuilder(WsSecurityHeaderBuilder(10), nullptr)->build(envelope);
  const auto key = Tarvel::Crypto::CreatePrivateKey(ReadDataFile("tokens/sts-ec256.key"));
  EXPECT_THROW(SignSoapMessage(*key, nullptr, envelope), Tarvel::Xml::Security::XmlSecurityException);
}

TEST_F(SignSoapMessageTest, AddsOnlyTheSignatureToAHeaderWithASamlToken) {
  const XMLCompositePtr header = WsSecurityHeaderBuilder(10);
  header->Add(ElementBuilder("saml", "Assertion", {{"ID", "_a1"}, {"xmlns:saml", SAML_URI}}));
  const std::string before = SerializeToXML(header);
  const std::string after = SerializeToXML(SamlRefSignedSoapBuilder(header, nullptr, m_key.get(), "_a1"));
  const std::string start = "<wsse:Security" + Declare("wsse", WSSE_URI) + "><wsu:Timestamp" + Declare("wsu", WSU_URI);
  ASSERT_EQ(before.substr(0, start.size()), start);
  const std::string rest = before.substr(start.size(), before.size() - start.size() - sizeof("</wsse:Security>") + 1);
  const std::string identified = start + " wsu:Id=\"Timestamp00000000-0000-4000-8000-000000000002\"" + rest;
  const std::size_t at = after.find(identified);
  ASSERT_NE(at, std::string::npos) << after;
  EXPECT_EQ(after.substr(at + identified.size(), 13), "<ds:Signature");
}

TEST(CreateWssuId, IsTheLocalNameFollowedByAUuid) {
  const FixedEnvironment environment;
  ElementRef element;
  ElementBuilder("p", "Thing")->build(element);
  EXPECT_EQ(CreateWssuId(element.get()), "Thing00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(CreateWssuId(element.get()), "Thing00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(SerializeToXML(std::make_shared<const PreBuiltElementImpl>(element)),
            "<p:Thing" + Declare("wsu", WSU_URI) + " wsu:Id=\"Thing00000000-0000-4000-8000-000000000001\"></p:Thing>");
}

TEST(CreateWssuId, IgnoresAnIdOfAnotherNamespace) {
  const FixedEnvironment environment;
  ElementRef element;
  ElementBuilder("p", "Thing", {{"Id", "mine"}, {"xmlns:q", "urn:q"}, {"q:Id", "theirs"}})->build(element);
  EXPECT_EQ(CreateWssuId(element.get()), "Thing00000000-0000-4000-8000-000000000001");
  EXPECT_NE(element->FindAttribute(WSU_URI, "Id"), nullptr);
}

} // namespace
} // namespace SsoClient
