// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/create_saml_token.h>

#include "support/data_file.h"
#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/environment.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <gtest/gtest.h>
#include <libxml/c14n.h>
#include <libxml/parser.h>

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::Crypto::CertificateList;
using Tarvel::System::DateTime;

constexpr const char *TAMPERED = "Failed to verify signature: token might have been tampered with.";

std::string Fixture(const std::string &name) {
  return ReadDataFile("tokens/" + name + ".xml");
}

CertificateList Trusted(const std::string &name = "sts-rsa") {
  return Tarvel::Crypto::LoadCertificates(DataPath("tokens/" + name + ".crt"));
}

/// In all of these tests the time is 2026-01-02T03:04:05Z.
class CreateSamlTokenTest : public ::testing::Test {
private:
  Tarvel::ScopedEnvironment m_clock{{[] { return DateTime("2026-01-02T03:04:05Z").GetUtcTime(); }, {}}};
};

TEST_F(CreateSamlTokenTest, ReadsAFullToken) {
  const auto token = CreateSamlToken(Fixture("full"), Trusted());
  EXPECT_EQ("_a18b869b-2e81-c0c5-2955-2a3c4fa5c92e", token->GetId());
  EXPECT_EQ(DateTime("2020-01-01T00:00:00Z"), token->GetStartDate());
  EXPECT_EQ(DateTime("2120-01-01T00:00:00Z"), token->GetEndDate());
  EXPECT_EQ("{Name: alice; Domain:corp.example}", token->GetSubject().ToString());
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_TRUE(token->IsDelegable());
  EXPECT_TRUE(token->IsSolution());
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, token->GetConfirmationMethod());
  ASSERT_NE(nullptr, token->GetConfirmationCertificate());
  EXPECT_EQ("CN=holder,O=Example", token->GetConfirmationCertificate()->GetSubject());
}

TEST_F(CreateSamlTokenTest, ReplacesTheValuesOfTheCallersVariables) {
  const auto token = CreateSamlToken(Fixture("full"), Trusted());
  std::pair<std::string, std::string> fullName{"before", "before"};
  token->GetFullName(fullName);
  EXPECT_EQ((std::pair<std::string, std::string>("Alice", "Liddell")), fullName);

  std::vector<PrincipalId> groups{{"before", "before"}};
  token->GetGroups(groups);
  ASSERT_EQ(3u, groups.size());
  EXPECT_EQ("{Name: Administrators; Domain:corp.example}", groups[0].ToString());
  EXPECT_EQ("{Name: Users; Domain:corp.example}", groups[1].ToString());
  EXPECT_EQ("{Name: Ops\\Night Shift; Domain:corp.example}", groups[2].ToString());

  std::set<std::string> audience{"before"};
  token->GetAudience(audience);
  EXPECT_EQ((std::set<std::string>{"https://files.corp.example/", "https://mail.corp.example/"}), audience);
}

TEST_F(CreateSamlTokenTest, ReadsDelegationChainAndAdviceInOrder) {
  const auto token = CreateSamlToken(Fixture("full"), Trusted());
  std::vector<Delegate> chain{Delegate()};
  token->GetDelegationChain(chain);
  ASSERT_EQ(2u, chain.size());
  EXPECT_EQ("{Name: gateway; Domain:corp.example}", chain[0].subject.ToString());
  EXPECT_EQ(DateTime("2020-01-01T00:00:01.250Z"), chain[0].delegationInstant);
  EXPECT_EQ("{Name: backup; Domain:corp.example}", chain[1].subject.ToString());
  EXPECT_EQ(DateTime("2020-01-01T00:00:02Z"), chain[1].delegationInstant);

  std::vector<Advice> advice(3);
  token->GetAdvice(advice);
  ASSERT_EQ(2u, advice.size());
  EXPECT_EQ("urn:corp.example:mapper", advice[0].source);
  ASSERT_EQ(2u, advice[0].attributes.size());
  EXPECT_EQ("urn:corp.example:advice:color", advice[0].attributes[0].name);
  EXPECT_EQ((std::vector<std::string>{"green", "blue"}), advice[0].attributes[0].values);
  EXPECT_TRUE(advice[0].attributes[1].values.empty());
  EXPECT_EQ("urn:corp.example:audit", advice[1].source);
}

TEST_F(CreateSamlTokenTest, ReadsAMinimalToken) {
  const auto token = CreateSamlToken(Fixture("bearer-minimal"), Trusted());
  EXPECT_FALSE(token->IsRenewable());
  EXPECT_FALSE(token->IsDelegable());
  EXPECT_FALSE(token->IsSolution());
  EXPECT_EQ(SamlToken::BEARER, token->GetConfirmationMethod());
  EXPECT_EQ(nullptr, token->GetConfirmationCertificate());
  std::pair<std::string, std::string> fullName{"before", "before"};
  token->GetFullName(fullName);
  EXPECT_EQ((std::pair<std::string, std::string>()), fullName);
  std::vector<PrincipalId> groups(1);
  token->GetGroups(groups);
  EXPECT_TRUE(groups.empty());
  std::vector<Delegate> chain(1);
  token->GetDelegationChain(chain);
  EXPECT_TRUE(chain.empty());
  std::set<std::string> audience{"before"};
  token->GetAudience(audience);
  EXPECT_TRUE(audience.empty());
  std::vector<Advice> advice(1);
  token->GetAdvice(advice);
  EXPECT_TRUE(advice.empty());
}

TEST_F(CreateSamlTokenTest, AcceptsEveryGenuineToken) {
  for (const char *const name : {"bearer",
                                 "bearer-minimal",
                                 "holder-of-key",
                                 "delegated",
                                 "full",
                                 "bearer-5k",
                                 "bearer-50k",
                                 "c14n-inclusive",
                                 "c14n-inclusive-with-comments",
                                 "c14n-exclusive-with-comments",
                                 "c14n-inclusive-prefixes",
                                 "c14n-mixed",
                                 "style-default-namespace",
                                 "style-prefixes-on-root",
                                 "style-prefixes-on-root-inclusive",
                                 "style-pretty",
                                 "rsa-sha256",
                                 "rsa-sha384",
                                 "rsa-sha512",
                                 "rsa-pss-sha256",
                                 "rsa-pss-sha384",
                                 "rsa-pss-sha512",
                                 "reference-empty-uri",
                                 "reference-two"}) {
    SCOPED_TRACE(name);
    EXPECT_NO_THROW(EXPECT_EQ("alice", CreateSamlToken(Fixture(name), Trusted())->GetSubject().name));
  }
}

TEST_F(CreateSamlTokenTest, ReturnsTheTextByteForByte) {
  for (const char *const name : {"bearer", "style-pretty", "c14n-inclusive-with-comments"}) {
    const std::string xml = Fixture(name);
    EXPECT_EQ(xml, CreateSamlToken(xml, Trusted())->ToXml());
  }
}

/// The canonical form of a document by libxml2, without its comments.
std::string CanonicalFormByLibxml2(const std::string &xml) {
  const std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> document(
      xmlReadMemory(xml.data(), static_cast<int>(xml.size()), "", nullptr, 0), xmlFreeDoc);
  xmlChar *octets = nullptr;
  const int length = xmlC14NDocDumpMemory(document.get(), nullptr, XML_C14N_1_0, nullptr, 0, &octets);
  const std::string text(reinterpret_cast<const char *>(octets), static_cast<std::size_t>(length));
  xmlFree(octets);
  return text;
}

/// The position after the end tag of the assertion. Processing instructions may follow it.
std::size_t EndOfAssertion(const std::string &xml) {
  return xml.rfind("Assertion>") + std::string_view("Assertion>").size();
}

/// A canonical document without the processing instructions around its document element.
std::string DocumentElementOf(const std::string &canonical) {
  std::size_t begin = 0;
  while (canonical.compare(begin, 2, "<?") == 0) {
    begin = canonical.find("?>\n", begin) + 3;
  }
  return canonical.substr(begin, EndOfAssertion(canonical) - begin);
}

TEST_F(CreateSamlTokenTest, FromDomReturnsTheCanonicalFormOfTheElement) {
  for (const char *const name : {"full", "style-pretty", "c14n-inclusive-with-comments", "style-default-namespace"}) {
    SCOPED_TRACE(name);
    const ParsedDocument document(Fixture(name));
    EXPECT_EQ(DocumentElementOf(CanonicalFormByLibxml2(Fixture(name))),
              CreateSamlTokenFromDom(document.Root(), Trusted())->ToXml());
  }
}

TEST_F(CreateSamlTokenTest, FromDomAcceptsAnAssertionInALargerDocument) {
  const std::string declaration = "<?xml version=\"1.0\"?>\n";
  const std::string token = ReplaceOnce(Fixture("full"), declaration, "");
  const ParsedDocument document("<e:Envelope xmlns:e='urn:envelope'>" + token + "</e:Envelope>");
  const auto fromDom = CreateSamlTokenFromDom(document.Child("Assertion"), Trusted());
  EXPECT_EQ("alice", fromDom->GetSubject().name);
  // Inclusive canonicalisation writes all declarations in scope. An exclusive signature ignores them, so the text verifies.
  EXPECT_NE(std::string::npos, fromDom->ToXml().find("xmlns:e=\"urn:envelope\""));
  EXPECT_EQ(fromDom->GetId(), CreateSamlToken(fromDom->ToXml(), Trusted())->GetId());
}

TEST_F(CreateSamlTokenTest, FromDomPassesOnTheExceptionOfAnElementWithoutCanonicalForm) {
  const ParsedDocument document(
      "<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"><none:Issuer/></Assertion>");
  EXPECT_THROWS_MESSAGE(CreateSamlTokenFromDom(document.Root(), Trusted()), Tarvel::Xml::Security::XmlSecurityException,
                        "No canonical form: the prefix \"none\" is not bound at line 1, column 58");
}

TEST_F(CreateSamlTokenTest, OutlivesTheDocumentItWasMadeFrom) {
  std::shared_ptr<const SamlToken> token;
  {
    const ParsedDocument document(Fixture("full"));
    token = CreateSamlTokenFromDom(document.Root(), Trusted());
  }
  EXPECT_EQ("CN=holder,O=Example", token->GetConfirmationCertificate()->GetSubject());
}

TEST_F(CreateSamlTokenTest, PassesOnTheParsersExceptionForMalformedXml) {
  for (const std::string &xml : {std::string(), std::string("not XML"), std::string("<Assertion"),
                                 std::string("<!DOCTYPE a><a/>"), std::string("\xff\xfe<a/>"), std::string(1, '\0')}) {
    EXPECT_THROW(CreateSamlToken(xml, Trusted()), Tarvel::Xml::XMLParseException) << xml;
  }
}

TEST_F(CreateSamlTokenTest, RefusesADocumentThatIsNotAnAssertion) {
  EXPECT_THROWS_MESSAGE(CreateSamlToken("<html/>", Trusted()), ParseException,
                        "Expected element 'Assertion' not found.");
  const ParsedDocument document("<html/>");
  EXPECT_THROWS_MESSAGE(CreateSamlTokenFromDom(document.Root(), Trusted()), ParseException,
                        "Expected element 'Assertion' not found.");
}

TEST_F(CreateSamlTokenTest, RefusesAChangedToken) {
  for (const auto &change : std::vector<std::pair<std::string, std::string>>{
           {">alice@corp.example<", ">mallory@corp.example<"},
           {"corp.example\\Users", "corp.example\\Owners"},
           {"AuthnInstant=\"2020-01-01T00:00:00.000Z\"", "AuthnInstant=\"2020-01-01T00:00:00.001Z\""},
           {"</saml:AttributeStatement>", "<saml:Attribute Name=\"x\"/></saml:AttributeStatement>"}}) {
    EXPECT_THROWS_MESSAGE(CreateSamlToken(ReplaceOnce(Fixture("full"), change.first, change.second), Trusted()),
                          InvalidSignatureException, TAMPERED);
  }
}

TEST_F(CreateSamlTokenTest, RefusesATokenSignedWithAKeyThatIsNotTrusted) {
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("signed-by-other"), Trusted()), InvalidSignatureException, TAMPERED);
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("full"), Trusted("sts-rsa-2")), InvalidSignatureException, TAMPERED);
}

TEST_F(CreateSamlTokenTest, AcceptsATokenSignedWithAnyTrustedKey) {
  CertificateList trusted = Trusted();
  trusted.push_back(Trusted("sts-rsa-2").front());
  EXPECT_NO_THROW(CreateSamlToken(Fixture("bearer"), trusted));
  EXPECT_NO_THROW(CreateSamlToken(Fixture("signed-by-second"), trusted));
}

TEST_F(CreateSamlTokenTest, RefusesEveryTokenWhenNothingIsTrusted) {
  const std::string message = "Signature verification error. No trusted key can be used with the signature algorithm "
                              "\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"";
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("bearer"), CertificateList()), InvalidSignatureException, message);
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("bearer"), CertificateList{nullptr, nullptr}),
                        InvalidSignatureException, message);
  const Tarvel::Crypto::Certificate *const none = nullptr;
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("bearer"), none), InvalidSignatureException, message);
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("bearer"), Trusted("sts-ec256")), InvalidSignatureException, message);
}

TEST_F(CreateSamlTokenTest, AcceptsOneCertificateByPointer) {
  const CertificateList trusted = Trusted();
  EXPECT_NO_THROW(CreateSamlToken(Fixture("bearer"), trusted.front().get()));
}

TEST_F(CreateSamlTokenTest, RefusesExpiredAndEarlyTokens) {
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("expired"), Trusted()), ParseException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("early"), Trusted()), ParseException,
                        "Token start date is in the future: 2110-01-01T00:00:00.000Z");
}

TEST_F(CreateSamlTokenTest, ExtendsTheValidityByTheGivenTolerance) {
  constexpr std::int64_t HUNDRED_YEARS = std::int64_t{100} * 366 * 86400;
  EXPECT_NO_THROW(CreateSamlToken(Fixture("expired"), Trusted(), HUNDRED_YEARS));
  EXPECT_NO_THROW(CreateSamlToken(Fixture("early"), Trusted(), HUNDRED_YEARS));
  const ParsedDocument document(Fixture("expired"));
  EXPECT_NO_THROW(CreateSamlTokenFromDom(document.Root(), Trusted(), HUNDRED_YEARS));
}

TEST(CreateSamlTokenClock, ToleratesTenMinutesByDefault) {
  const std::int64_t end = DateTime("2021-01-01T00:00:00Z").GetUtcTime();
  const ParsedDocument document(Fixture("expired"));
  const CertificateList trusted = Trusted();
  {
    const Tarvel::ScopedEnvironment clock({[end] { return end + 600'000'000 - 1; }, {}});
    EXPECT_NO_THROW(CreateSamlToken(Fixture("expired"), trusted));
    EXPECT_NO_THROW(CreateSamlToken(Fixture("expired"), trusted.front().get()));
    EXPECT_NO_THROW(CreateSamlTokenFromDom(document.Root(), trusted));
  }
  const std::string message = "The token has expired at: 2021-01-01T00:00:00.000Z";
  const Tarvel::ScopedEnvironment clock({[end] { return end + 600'000'000; }, {}});
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("expired"), trusted), ParseException, message);
  EXPECT_THROWS_MESSAGE(CreateSamlToken(Fixture("expired"), trusted.front().get()), ParseException, message);
  EXPECT_THROWS_MESSAGE(CreateSamlTokenFromDom(document.Root(), trusted), ParseException, message);
}

TEST_F(CreateSamlTokenTest, ChecksSyntaxThenPropertiesThenSignature) {
  const std::string tampered = ReplaceOnce(Fixture("expired"), ">alice@corp.example<", ">mallory@corp.example<");
  EXPECT_THROWS_MESSAGE(
      CreateSamlToken(ReplaceOnce(tampered, "</saml:Conditions>", "<x/></saml:Conditions>"), CertificateList()),
      ParseException, "Unknown or duplicate restriction node under Conditions: x");
  EXPECT_THROWS_MESSAGE(CreateSamlToken(tampered, CertificateList()), ParseException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
  EXPECT_THROWS_MESSAGE(CreateSamlToken(tampered, Trusted(), std::int64_t{100} * 366 * 86400),
                        InvalidSignatureException, TAMPERED);
}

TEST_F(CreateSamlTokenTest, VerifiesBeforeItReadsTheFacts) {
  // The name is malformed, but nothing in a token that was changed is reported.
  const std::string tampered = ReplaceOnce(Fixture("bearer"), ">alice@corp.example<", ">alice<");
  EXPECT_THROWS_MESSAGE(CreateSamlToken(tampered, Trusted()), InvalidSignatureException, TAMPERED);
}

/// Expects a refusal with one of the documented classes. Which one it is depends on where the text ends.
void ExpectRefused(const std::string &xml, const CertificateList &trusted) {
  try {
    CreateSamlToken(xml, trusted);
    ADD_FAILURE() << "accepted the first " << xml.size() << " bytes";
  } catch (const Tarvel::Xml::XMLParseException &) {
  } catch (const InvalidTokenException &) {
  }
}

TEST_F(CreateSamlTokenTest, RefusesEveryPrefixOfAToken) {
  const CertificateList trusted = Trusted();
  for (const char *const name : {"full", "style-pretty", "style-default-namespace"}) {
    SCOPED_TRACE(name);
    const std::string xml = Fixture(name);
    for (std::size_t length = 0; length < EndOfAssertion(xml); ++length) {
      ExpectRefused(xml.substr(0, length), trusted);
    }
  }
}

TEST_F(CreateSamlTokenTest, RefusesATokenWithAnyCharacterChanged) {
  const CertificateList trusted = Trusted();
  const std::string xml = Fixture("full");
  const std::size_t begin = xml.find("<saml:Assertion");
  const std::size_t signature = xml.find("<ds:KeyInfo");
  // The key's description is not signed, nor are blanks and line ends inside the signature's own tags and Base64 text.
  for (std::size_t position = begin; position < EndOfAssertion(xml); ++position) {
    const bool unsignedText = position >= signature && position < xml.find("</ds:Signature>");
    if (unsignedText || xml[position] == ' ' || xml[position] == '\n') {
      continue;
    }
    std::string changed = xml;
    changed[position] = xml[position] == 'x' ? 'y' : 'x';
    try {
      CreateSamlToken(changed, trusted);
      ADD_FAILURE() << "accepted a change at " << position << ": " << xml.substr(position, 40);
    } catch (const Tarvel::Xml::XMLParseException &) {
    } catch (const InvalidTokenException &) {
    }
  }
}

} // namespace
