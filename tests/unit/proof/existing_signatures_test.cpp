// SPDX-License-Identifier: Apache-2.0
// Messages that have signatures already: either they stay valid, or the message is refused and stays as it was.

#include "proof/existing_signatures.h"

#include "support/fixed_environment.h"
#include "support/sample_message.h"
#include "support/token_stand_in.h"
#include "unit/proof/unchanged_message.h"

#include <ssoclient/proof/sign_message.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

const std::string EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";
const std::string INCLUSIVE = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";
const std::string COVERS = ", and would not be valid after a change of the security header";
const std::string MAY_COVER = "A signature in the message may cover the security header: ";

std::string Transform(const std::string &algorithm, const std::string &content = "") {
  return "<d:Transform Algorithm=\"" + algorithm + "\">" + content + "</d:Transform>";
}

/// A signature with one reference.
std::string SignatureOver(const std::string &uriAttribute, const std::string &transforms = Transform(EXCLUSIVE),
                          const std::string &method = EXCLUSIVE) {
  return "<d:Signature xmlns:d=\"" + DS + "\"><d:SignedInfo><d:CanonicalizationMethod Algorithm=\"" + method +
         "\"/><d:Reference " + uriAttribute + "><d:Transforms>" + transforms +
         "</d:Transforms></d:Reference></d:SignedInfo></d:Signature>";
}

std::string SignatureOverId(const std::string &identifier, const std::string &transforms = Transform(EXCLUSIVE)) {
  return SignatureOver("URI=\"#" + identifier + "\"", transforms);
}

class ExistingSignaturesTest : public testing::Test {
protected:
  testing::AssertionResult Refuses(const std::string &message, const std::string &text,
                                   const SecurityHeaderOptions &options = {}) const {
    return RefusesUnchanged<InvalidMessageException>(
        message, [&](Tarvel::Xml::Document &document) { AttachToken(document, m_bearer, options); }, text);
  }

  std::string Sign(const std::string &message, const std::vector<MessagePart> &parts = {}) const {
    return SignMessage(message, *m_holder, *m_key, parts);
  }

  testing::AssertionResult RefusesToSign(const std::string &message, const std::string &text,
                                         const std::vector<MessagePart> &parts = {}) const {
    return RefusesUnchanged<InvalidMessageException>(
        message, [&](Tarvel::Xml::Document &document) { SignMessage(document, *m_holder, *m_key, parts); }, text);
  }

  const FixedEnvironment m_environment;
  const TokenStandIn m_bearer{"_t", "<t ID=\"_t\"/>", SamlToken::BEARER};
  const std::shared_ptr<const SamlToken> m_holder = SampleToken("tokens/holder-of-key");
  const Tarvel::Ref<const Tarvel::Crypto::PrivateKey> m_key = SampleKey("holder");
};

TEST_F(ExistingSignaturesTest, AreKeptWhenTheyCoverOtherElements) {
  const std::string security = SampleSecurity("<u:Timestamp u:Id=\"ts\"></u:Timestamp>" + SignatureOverId("ts") +
                                              SignatureOverId("b") + SignatureOverId("h"));
  const std::string message =
      SampleEnvelope("<s:Header>" + security + "<x Id=\"h\"></x></s:Header><s:Body Id=\"b\"></s:Body>");
  EXPECT_NO_THROW(AttachToken(message, m_bearer));
  EXPECT_NO_THROW(Sign(message));
}

TEST_F(ExistingSignaturesTest, AreRefusedWhenTheyCoverTheHeaderThatGrows) {
  for (const std::string attribute : {"Id", "ID", "xml:id", "u:Id"}) {
    EXPECT_TRUE(Refuses(SampleMessage(SampleSecurity(SignatureOverId("h"), " " + attribute + "=\"h\"")),
                        "A signature in the message covers the element 'o:Security'" + COVERS));
  }
}

TEST_F(ExistingSignaturesTest, AreRefusedWhenTheyCoverTheSoapHeaderOrTheEnvelope) {
  const std::string signature = SampleSecurity(SignatureOverId("x"));
  EXPECT_TRUE(Refuses(SampleEnvelope("<s:Header Id=\"x\">" + signature + "</s:Header><s:Body/>"),
                      "A signature in the message covers the element 's:Header'" + COVERS));
  const std::string envelope =
      "<s:Envelope xmlns:s=\"" + SOAP11 + "\" Id=\"x\"><s:Body>" + SignatureOverId("x") + "</s:Body></s:Envelope>";
  EXPECT_TRUE(Refuses(envelope, "A signature in the message covers the element 's:Envelope'" + COVERS));
}

TEST_F(ExistingSignaturesTest, AreRefusedWhenTheyCoverTheWholeMessage) {
  for (const std::string &transforms : {Transform(EXCLUSIVE), std::string()}) {
    EXPECT_TRUE(Refuses(SampleEnvelope("<s:Body>" + SignatureOver("URI=\"\"", transforms) + "</s:Body>"),
                        "A signature in the message covers the whole message" + COVERS));
  }
}

TEST_F(ExistingSignaturesTest, MayCoverAHeaderForAnotherRole) {
  const std::string other = SampleSecurity(SignatureOverId("h"), " u:Id=\"h\" s:actor=\"urn:other\"");
  EXPECT_NO_THROW(AttachToken(SampleMessage(other), m_bearer));
  SecurityHeaderOptions options;
  options.role = "urn:other";
  EXPECT_TRUE(
      Refuses(SampleMessage(other), "A signature in the message covers the element 'o:Security'" + COVERS, options));
}

TEST_F(ExistingSignaturesTest, AreRefusedWhenTheirReferencesDoNotResolveToOneElement) {
  for (const char *const uri : {"#nothing", "#xpointer(/)", "#", "cid:part@example", "http://example/#b", "b", "xb"}) {
    EXPECT_TRUE(Refuses(SampleEnvelope("<s:Body Id=\"b\" id=\"nothing\">" +
                                       SignatureOver("URI=\"" + std::string(uri) + "\"") + "</s:Body>"),
                        MAY_COVER + "its reference \"" + uri + "\" does not refer to exactly one element"));
  }
  EXPECT_TRUE(
      Refuses(SampleEnvelope("<s:Body Id=\"b\"><x ID=\"b\"/><y Id=\"b\"/>" + SignatureOverId("b") + "</s:Body>"),
              MAY_COVER + "its reference \"#b\" does not refer to exactly one element"));
  EXPECT_TRUE(Refuses(SampleEnvelope("<s:Body Id=\"\">" + SignatureOver("URI=\"cid:b\"") + "</s:Body>"),
                      MAY_COVER + "its reference \"cid:b\" does not refer to exactly one element"));
  EXPECT_TRUE(Refuses(SampleEnvelope("<s:Body>" + SignatureOver("") + "</s:Body>"),
                      MAY_COVER + "it has a reference without a URI"));
}

TEST_F(ExistingSignaturesTest, MayReferToAnElementThatHasTheIdentifierInTwoAttributes) {
  EXPECT_NO_THROW(
      AttachToken(SampleEnvelope("<s:Body Id=\"b\" ID=\"b\">" + SignatureOverId("b") + "</s:Body>"), m_bearer));
}

TEST_F(ExistingSignaturesTest, AreRefusedWhenATransformCanSelectOtherContent) {
  for (const char *const algorithm :
       {"http://www.w3.org/2002/06/xmldsig-filter2", "http://www.w3.org/TR/1999/REC-xpath-19991116",
        "http://www.w3.org/TR/1999/REC-xslt-19991116", ""}) {
    EXPECT_TRUE(Refuses(SampleEnvelope("<s:Body Id=\"b\">" +
                                       SignatureOverId("b", Transform(algorithm) + Transform(EXCLUSIVE)) + "</s:Body>"),
                        MAY_COVER + "its reference \"#b\" has a transform that can select other content"));
  }
  EXPECT_NO_THROW(AttachToken(
      SampleEnvelope("<s:Body Id=\"b\">" +
                     SignatureOverId("b", Transform("http://docs.oasis-open.org/wss/2004/01/"
                                                    "oasis-200401-wss-soap-message-security-1.0#STR-Transform")) +
                     "</s:Body>"),
      m_bearer));
}

TEST_F(ExistingSignaturesTest, AreFoundInManifestsAndInTokens) {
  const std::string manifest = "<d:Manifest xmlns:d=\"" + DS + "\"><d:Reference URI=\"\"/></d:Manifest>";
  EXPECT_TRUE(Refuses(SampleEnvelope("<s:Body>" + manifest + "</s:Body>"),
                      "A signature in the message covers the whole message" + COVERS));
}

const std::string DEPENDS =
    "The element 's:Body' cannot get an identifier: a signature in it depends on the namespaces "
    "around it. Give the element a wsu:Id before the signature is made";

TEST_F(ExistingSignaturesTest, KeepABodyFromGettingADeclarationThatTheirFormsInclude) {
  for (const std::string &signature : {
           SignatureOverId("d", Transform(INCLUSIVE)),
           SignatureOverId("d", ""),
           SignatureOverId("d", Transform(EXCLUSIVE, "<e:InclusiveNamespaces xmlns:e=\"" + EXCLUSIVE +
                                                         "\" PrefixList=\"a wsu\"/>")),
           SignatureOver("URI=\"#d\"", Transform(EXCLUSIVE), INCLUSIVE),
       }) {
    const std::string content = "<x Id=\"d\"></x>" + signature;
    EXPECT_TRUE(RefusesToSign(SampleEnvelope("<s:Body>" + content + "</s:Body>"), DEPENDS)) << signature;
    // A body that has an identifier, or a prefix for one, needs no declaration.
    EXPECT_NO_THROW(Sign(SampleEnvelope("<s:Body Id=\"b\">" + content + "</s:Body>")));
    EXPECT_NO_THROW(Sign(SampleEnvelope("<s:Body xmlns:q=\"" + WSU + "\">" + content + "</s:Body>")));
    // The same signature elsewhere does not matter.
    EXPECT_NO_THROW(Sign(SampleMessage(content)));
  }
}

TEST_F(ExistingSignaturesTest, LetABodyGetADeclarationThatTheirFormsDoNotInclude) {
  const std::string list = "<e:InclusiveNamespaces xmlns:e=\"" + EXCLUSIVE + "\" PrefixList=\"a wsu1 xwsu\"/>";
  EXPECT_NO_THROW(
      Sign(SampleEnvelope("<s:Body><x Id=\"d\"/>" + SignatureOverId("d", Transform(EXCLUSIVE, list)) + "</s:Body>")));
}

TEST_F(ExistingSignaturesTest, KeepAPartFromGettingADeclarationThatTheirFormsInclude) {
  const std::string part = "<p xmlns=\"urn:p\"><x Id=\"d\"></x>" + SignatureOverId("d", Transform(INCLUSIVE)) + "</p>";
  EXPECT_TRUE(
      RefusesToSign(SampleMessage(part),
                    "The element 'p' cannot get an identifier: a signature in it depends on the namespaces around "
                    "it. Give the element a wsu:Id before the signature is made",
                    {{"urn:p", "p"}}));
  EXPECT_NO_THROW(Sign(SampleMessage(part)));
}

} // namespace
} // namespace SsoClient
