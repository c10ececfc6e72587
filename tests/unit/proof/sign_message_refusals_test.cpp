// SPDX-License-Identifier: Apache-2.0
// What SignMessage refuses. After each refusal the message is as it was.

#include "support/fixed_environment.h"
#include "support/sample_message.h"
#include "support/token_stand_in.h"
#include "unit/proof/unchanged_message.h"

#include <ssoclient/proof/sign_message.h>
#include <tarvel/core/exception.h>
#include <tarvel/xml/security/exceptions.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;
using Tarvel::InvalidArgumentException;
using Tarvel::Crypto::KeyMismatchException;
using Tarvel::Xml::Document;
using Parts = std::vector<MessagePart>;

const std::string BLOCKS = "<a:A xmlns:a=\"urn:a\"/><b:A xmlns:b=\"urn:b\"/><b:A xmlns:b=\"urn:b\"/>";

class SignMessageRefusals : public testing::Test {
protected:
  template <typename Expected>
  testing::AssertionResult Refuses(const std::string &message, const std::string &text, const Parts &parts = {},
                                   const SecurityHeaderOptions &options = {}) const {
    return RefusesUnchanged<Expected>(
        message, [&](Document &document) { SignMessage(document, *m_token, *m_key, parts, options); }, text);
  }

  const FixedEnvironment m_environment;
  const std::shared_ptr<const SamlToken> m_token = SampleToken("tokens/holder-of-key");
  const Tarvel::Ref<const Tarvel::Crypto::PrivateKey> m_key = SampleKey("holder");
};

TEST_F(SignMessageRefusals, RefusesABearerToken) {
  EXPECT_THROWS_MESSAGE(SignMessage(SampleMessage(""), *SampleToken("tokens/bearer"), *m_key), InvalidArgumentException,
                        "Invalid argument : a bearer token has no key with which to sign a message: use AttachToken");
}

TEST_F(SignMessageRefusals, RefusesAnotherKeyThanThatOfTheToken) {
  const std::string message = SampleMessage("");
  EXPECT_THROWS_MESSAGE(SignMessage(message, *m_token, *SampleKey("other")), KeyMismatchException,
                        "The private key does not belong to the certificate CN=holder,O=Example");
  EXPECT_THROWS_MESSAGE(SignMessage(message, *m_token, *SampleKey("sts-ec256")), KeyMismatchException,
                        "The private key does not belong to the certificate CN=holder,O=Example");
  for (const char *const key : {"other", "sts-ec256"}) {
    EXPECT_THROWS_MESSAGE(SignMessage(message, *SampleToken("saml2/holder-rsa-value"), *SampleKey(key)),
                          KeyMismatchException, "The private key does not belong to the key of the token");
  }
}

TEST_F(SignMessageRefusals, RefusesATokenWithoutAUsableKey) {
  const TokenStandIn unknown("_t", "<t/>", SamlToken::HOLDER_OF_KEY);
  EXPECT_THROWS_MESSAGE(
      SignMessage(SampleMessage(""), unknown, *m_key), InvalidArgumentException,
      "Invalid argument : no message can be signed with the key of the token: the token states no key "
      "that can be read");
  const TokenStandIn weak("_t", "<t/>", SamlToken::HOLDER_OF_KEY,
                          Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa1024.crt")));
  EXPECT_THROWS_MESSAGE(SignMessage(SampleMessage(""), weak, *SampleKey("sts-rsa1024")), InvalidArgumentException,
                        "Invalid argument : no message can be signed with the key of the token: the RSA key has only "
                        "1024 bits; 2048 are the minimum");
}

TEST_F(SignMessageRefusals, RefusesPartsThatAreMissingOrThereTwice) {
  const std::string message = SampleMessage(BLOCKS);
  EXPECT_TRUE(
      Refuses<InvalidMessageException>(message, "The message has no header block '{urn:c}A'", {{"urn:c", "A"}}));
  EXPECT_TRUE(Refuses<InvalidMessageException>(message, "The message has no header block 'A'", {{"", "A"}}));
  EXPECT_TRUE(Refuses<InvalidMessageException>(message, "The message has two header blocks '{urn:b}A'",
                                               {{"urn:a", "A"}, {"urn:b", "A"}}));
  EXPECT_TRUE(Refuses<InvalidMessageException>(SampleEnvelope("<s:Body/>"),
                                               "The message has no header block '{urn:a}A'", {{"urn:a", "A"}}));
}

TEST_F(SignMessageRefusals, RefusesPartsThatAreNotValid) {
  const std::string message = SampleMessage(BLOCKS);
  const std::string text = "Invalid argument : ";
  EXPECT_TRUE(Refuses<InvalidArgumentException>(message, text + "a header block to sign has an empty local name",
                                                {{"urn:a", ""}}));
  EXPECT_TRUE(Refuses<InvalidArgumentException>(message, text + "the header block '{urn:a}A' is listed twice",
                                                {{"urn:a", "A"}, {"urn:b", "A"}, {"urn:a", "A"}}));
  EXPECT_TRUE(Refuses<InvalidArgumentException>(
      message, text + "the security header cannot be signed, because it will contain the signature",
      {{WSSE, "Security"}}));
  EXPECT_TRUE(Refuses<InvalidArgumentException>(message, text + "8 header blocks are to be signed; at most 7 can be",
                                                Parts(8, MessagePart{"urn:a", "A"})));
}

TEST_F(SignMessageRefusals, RefusesALifetimeThatIsNotPositive) {
  SecurityHeaderOptions options;
  options.lifetimeSec = 0;
  EXPECT_TRUE(Refuses<InvalidArgumentException>(
      SampleMessage(""), "Invalid argument : the lifetime of a message must be positive, not 0 seconds", {}, options));
}

TEST_F(SignMessageRefusals, RefusesAMessageThatHasTheToken) {
  const std::string text =
      "The message already has an element with the identifier '" + m_token->GetId() + "' of the token";
  EXPECT_TRUE(Refuses<InvalidMessageException>(SignMessage(SampleMessage(""), *m_token, *m_key), text));
}

TEST_F(SignMessageRefusals, RefusesIdentifiersThatOtherElementsHaveToo) {
  EXPECT_TRUE(Refuses<Tarvel::Xml::Security::XmlSecurityException>(
      SampleEnvelope("<s:Body Id=\"b\"><x ID=\"b\"/></s:Body>"),
      "The reference URI \"#b\" is not accepted: several elements have that identifier"));
  EXPECT_TRUE(Refuses<Tarvel::Xml::Security::XmlSecurityException>(
      SampleEnvelope("<s:Body xmlns:u=\"" + WSU + "\" u:Id=\"\"/>"),
      "The reference URI \"#\" is not accepted: it names nothing"));
}

TEST_F(SignMessageRefusals, LeavesTheMessageAsItWasWhenItHasNoCanonicalForm) {
  EXPECT_TRUE(Refuses<Tarvel::Xml::Security::XmlSecurityException>(
      SampleMessage("<a xmlns=\"relative\"/>" + SampleSecurity("")),
      "No canonical form: the namespace name \"relative\" is relative at line 1, column 75", {{"relative", "a"}}));
}

TEST_F(SignMessageRefusals, RefusesTextThatIsNotAnEnvelope) {
  EXPECT_THROWS_MESSAGE(SignMessage("<a/>", *m_token, *m_key), InvalidMessageException,
                        "The message is not a SOAP envelope");
  EXPECT_THROWS_MESSAGE(SignMessage("", *m_token, *m_key), Tarvel::Xml::XMLParseException,
                        "the document is empty at line 1, column 1");
}

} // namespace
} // namespace SsoClient
