// SPDX-License-Identifier: Apache-2.0

#include "compose/ws_security.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/token_stand_in.h"
#include "unit/compose/wire_uris.h"

#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <algorithm>

namespace SsoClient {
namespace {

using namespace Testing;

const std::string TIMESTAMP = "<wsu:Timestamp" + Declare("wsu", WSU_URI) +
                              "><wsu:Created>2026-01-02T03:04:05.006Z</wsu:Created>"
                              "<wsu:Expires>2026-01-02T03:14:05.006Z</wsu:Expires></wsu:Timestamp>";

TEST(WssuTimestampBuilder, ExpiresExactlyTenMinutesAfterItWasCreatedWithMilliseconds) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(WssuTimestampBuilder(10)), TIMESTAMP);
}

TEST(WssuTimestampBuilder, ReadsTheClockWhenItIsMadeAndNotWhenItIsBuilt) {
  std::int64_t now = FIXED_NOW;
  const Tarvel::ScopedEnvironment environment({[&now] { return now; }, {}});
  const XMLBuilderPtr timestamp = WssuTimestampBuilder(10);
  now += 3600000000;
  EXPECT_EQ(SerializeToXML(timestamp), TIMESTAMP);
}

TEST(WssuTimestampBuilder, ReadsTheClockOnce) {
  std::int64_t now = FIXED_NOW;
  const Tarvel::ScopedEnvironment environment({[&now] { return now += 1000000; }, {}});
  WssuTimestampBuilder(10);
  EXPECT_EQ(now, FIXED_NOW + 1000000);
}

TEST(WsSecurityHeaderBuilder, ContainsTheTimestampFollowedByTokens) {
  const FixedEnvironment environment;
  const XMLCompositePtr header = WsSecurityHeaderBuilder(10);
  header->Add(ElementBuilder("wsse", "Token"));
  EXPECT_EQ(SerializeToXML(header), "<wsse:Security" + Declare("wsse", WSSE_URI) + ">" + TIMESTAMP +
                                        "<wsse:Token></wsse:Token></wsse:Security>");
}

TEST(WsseUsernameTokenBuilder, HasOnlyTheUserNameWithoutAPassword) {
  EXPECT_EQ(SerializeToXML(WsseUsernameTokenBuilder("alice")),
            "<wsse:UsernameToken" + Declare("wsse", WSSE_URI) +
                "><wsse:Username>alice</wsse:Username></wsse:UsernameToken>");
}

TEST(WsseUsernameTokenBuilder, WritesThePasswordAfterTheUserName) {
  EXPECT_EQ(SerializeToXML(WsseUsernameTokenBuilder("alice", "pa<ss")),
            "<wsse:UsernameToken" + Declare("wsse", WSSE_URI) +
                "><wsse:Username>alice</wsse:Username><wsse:Password Type=\"http://docs.oasis-open.org/wss/2004/01/"
                "oasis-200401-wss-username-token-profile-1.0#PasswordText\">pa&lt;ss</wsse:Password>"
                "</wsse:UsernameToken>");
}

TEST(WsseUsernameTokenBuilder, WritesEmptyNamesAndPasswordsAsEmptyTexts) {
  EXPECT_EQ(SerializeToXML(WsseUsernameTokenBuilder("", "")),
            "<wsse:UsernameToken" + Declare("wsse", WSSE_URI) +
                "><wsse:Username></wsse:Username><wsse:Password Type=\"http://docs.oasis-open.org/wss/2004/01/"
                "oasis-200401-wss-username-token-profile-1.0#PasswordText\"></wsse:Password></wsse:UsernameToken>");
}

TEST(WsseX509v3BinarySecTokenBuilder, ContainsTheCertificateAsBase64AndDoesNotDeclareWsse) {
  const std::string pem = ReadDataFile("tokens/holder.crt");
  const auto certificate = Tarvel::Crypto::CreateCertificateFromPem(pem);
  // The body of the PEM text, without its line ends, is the same encoding.
  std::string base64 = pem.substr(pem.find("-----\n") + 6);
  base64.resize(base64.find("-----END"));
  base64.erase(std::remove(base64.begin(), base64.end(), '\n'), base64.end());
  EXPECT_EQ(SerializeToXML(WsseX509v3BinarySecTokenBuilder("theId", certificate.get())),
            "<wsse:BinarySecurityToken EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
            "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" ValueType=\"http://docs.oasis-open.org/wss/2004/"
            "01/oasis-200401-wss-x509-token-profile-1.0#X509v3\" wsu:Id=\"theId\"" +
                Declare("wsu", WSU_URI) + ">" + base64 + "</wsse:BinarySecurityToken>");
}

TEST(WsseX509v3BSTReferenceBuilder, WritesTheFragmentUriBeforeTheValueType) {
  EXPECT_EQ(SerializeToXML(WsseX509v3BSTReferenceBuilder("theId")),
            "<wsse:SecurityTokenReference" + Declare("wsse", WSSE_URI) +
                "><wsse:Reference URI=\"#theId\" ValueType=\"http://docs.oasis-open.org/wss/2004/01/"
                "oasis-200401-wss-x509-token-profile-1.0#X509v3\"></wsse:Reference></wsse:SecurityTokenReference>");
}

TEST(WsseSamlKeyIdReferenceBuilder, ContainsBothSpellingsOfTheSamlTokenProfile) {
  EXPECT_EQ(SerializeToXML(WsseSamlKeyIdReferenceBuilder("_a1")),
            "<wsse:SecurityTokenReference wsse11:TokenType=\"http://docs.oasis-open.org/wss/"
            "oasis-wss-saml-tokenprofile-1.1#SAMLV2.0\"" +
                Declare("wsse", WSSE_URI) + Declare("wsse11", WSSE11_URI) +
                "><wsse:KeyIdentifier ValueType=\"http://docs.oasis-open.org/wss/"
                "oasis-wss-saml-token-profile-1.1#SAMLID\">_a1</wsse:KeyIdentifier></wsse:SecurityTokenReference>");
}

TEST(InsertSamlTokenBuilder, ReturnsTheAssertionAsItWasIssued) {
  const std::string text = "<a:Assertion xmlns:a=\"urn:a\" ID=\"x\"  b=\"2\">\n  <!-- kept --><?kept too?>\n"
                           "\t<c xmlns=\"urn:c\">1 &lt; 2</c>\n</a:Assertion>";
  const TokenStandIn token("x", "<?xml version=\"1.0\"?>\n" + text, SamlToken::BEARER);
  EXPECT_EQ(SerializeToXML(InsertSamlTokenBuilder(token)),
            "<a:Assertion xmlns:a=\"urn:a\" ID=\"x\" b=\"2\">\n  <!-- kept --><?kept too?>\n"
            "\t<c xmlns=\"urn:c\">1 &lt; 2</c>\n</a:Assertion>");
}

TEST(InsertSamlTokenBuilder, PassesOnTheParsersExceptionForATokenThatDoesNotParse) {
  const TokenStandIn token("x", "<a:Assertion xmlns:a=\"urn:a\">", SamlToken::BEARER);
  EXPECT_THROW(InsertSamlTokenBuilder(token), Tarvel::Xml::XMLParseException);
}

TEST(InsertSamlTokenBuilder, CanBeBuiltIntoOneTreeOnly) {
  const TokenStandIn token("x", "<a:Assertion xmlns:a=\"urn:a\"/>", SamlToken::BEARER);
  const auto parent = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
  parent->Add(InsertSamlTokenBuilder(token));
  EXPECT_EQ(SerializeToXML(parent), "<p:e><a:Assertion xmlns:a=\"urn:a\"></a:Assertion></p:e>");
  EXPECT_THROW(SerializeToXML(parent), Tarvel::InvalidStateException);
}

} // namespace
} // namespace SsoClient
