// SPDX-License-Identifier: Apache-2.0
// The verification of signed tokens in the profile SAML2, and what the options add to it.

#include "support/data_file.h"
#include "support/facts_of.h"
#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "token/saml_token_impl.h"
#include "unit/token/saml2_assertion.h"
#include "unit/token/signed_assertion.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/core/environment.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

constexpr const char *UPN_NAME =
    R"(<saml:NameID Format="http://schemas.xmlsoap.org/claims/UPN">alice@corp</saml:NameID>)";

VerifyOptions Saml2() {
  VerifyOptions options;
  options.profile = TokenProfile::SAML2;
  return options;
}

const SamlTokenImpl &AsImpl(const SamlToken &token) {
  return static_cast<const SamlTokenImpl &>(token);
}

/// A confirmation with data that has these attributes.
std::string BearerWith(const std::string &attributes) {
  return Piece::Confirmation("bearer", "<saml:SubjectConfirmationData " + attributes + "/>");
}

std::string Session(const std::string &end) {
  return ReplaceOnce(Piece::AuthnStatement(), "AuthnInstant=", "SessionNotOnOrAfter=\"" + end + "\" AuthnInstant=");
}

std::string Audience(const std::string &audience) {
  return "<saml:AudienceRestriction><saml:Audience>" + audience + "</saml:Audience></saml:AudienceRestriction>";
}

/// A bearer token with these conditions and statements.
std::string Bearer(const std::string &conditions, const std::string &statements = {}) {
  return Assertion({Piece::ISSUER, Piece::SIGNATURE, Piece::Subject(UPN_NAME, BearerWith("")),
                    Piece::Conditions(conditions), statements});
}

/// In all of these tests the time is 2026-01-01T01:00:00Z.
class Saml2VerifierTest : public ::testing::Test {
protected:
  /// Signs `assertion` and verifies it.
  static std::shared_ptr<const SamlToken> Verify(const std::string &assertion, const VerifyOptions &options = Saml2()) {
    return TokenVerifier(TokenCertificates(), options).Verify(SignAgain(assertion));
  }

  static void ExpectRefusal(const std::string &message, const std::string &assertion,
                            const VerifyOptions &options = Saml2()) {
    EXPECT_THROWS_MESSAGE(Verify(assertion, options), ParseException, message);
  }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return DateTime("2026-01-01T01:00:00Z").GetUtcTime(); }, {}}};
};

TEST_F(Saml2VerifierTest, AcceptsWhatTheProfileStrictDoesNotRead) {
  const std::string assertion =
      AssertionConfirmedBy("<saml:SubjectConfirmation Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"/>");
  const auto token = Verify(assertion);
  EXPECT_EQ("_a1", token->GetId());
  EXPECT_EQ("{Name: alice@corp; Domain:nameid:format=urn:format:subject}", token->GetSubject().ToString());
  EXPECT_EQ(SamlToken::BEARER, token->GetConfirmationMethod());
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), token->GetStartDate());
  EXPECT_EQ(DateTime("2026-01-01T07:00:00Z"), token->GetEndDate());
  EXPECT_EQ(SignAgain(assertion), token->ToXml());
  EXPECT_THROWS_MESSAGE(CreateSamlToken(SignAgain(assertion), TokenCertificates()), ParseException,
                        "Expected element 'SubjectConfirmationData' not found.");
}

TEST_F(Saml2VerifierTest, AcceptsAnElementOfALargerDocument) {
  const ParsedDocument document("<envelope>" + SignAgain(AssertionConfirmedBy(BearerWith(""))) + "</envelope>");
  const auto token = TokenVerifier(TokenCertificates(), Saml2()).Verify(document.Child("Assertion"));
  EXPECT_EQ("alice@corp", AsImpl(*token).GetNameId().value);
}

TEST_F(Saml2VerifierTest, ReadsTheSameFactsAsTheProfileStrictInEveryFixture) {
  const Tarvel::ScopedEnvironment clock({[] { return DateTime("2026-01-02T03:04:05Z").GetUtcTime(); }, {}});
  const auto trusted = TokenCertificates({"sts-rsa", "sts-rsa-2", "sts-ec256", "sts-rsa3072"});
  const TokenVerifier strict(trusted);
  const TokenVerifier saml2(trusted, Saml2());
  std::size_t accepted = 0;
  for (const auto &entry : std::filesystem::directory_iterator(DataPath("tokens"))) {
    if (entry.path().extension() != ".xml") {
      continue;
    }
    SCOPED_TRACE(entry.path());
    const std::string xml = TokenFixture(entry.path().stem());
    std::shared_ptr<const SamlToken> token;
    try {
      token = strict.Verify(xml);
    } catch (const Tarvel::Exception &) {
      continue;
    }
    const auto same = saml2.Verify(xml);
    ++accepted;
    EXPECT_EQ(FactsOf(*token), FactsOf(*same));
    EXPECT_EQ(AsImpl(*token).GetNameId(), AsImpl(*same).GetNameId());
    EXPECT_EQ(0u, AsImpl(*same).GetUsedConfirmation());
  }
  EXPECT_LT(20u, accepted);
}

TEST_F(Saml2VerifierTest, KeepsTheIdentifierOfTheSubjectExactly) {
  const std::string name =
      R"(<saml:NameID Format="urn:oasis:names:tc:SAML:2.0:nameid-format:persistent")"
      R"( NameQualifier="https://Idp/" SPNameQualifier="Sp" SPProvidedID="Own">aB@c</saml:NameID>)";
  const auto token = Verify(AssertionAbout(Piece::Subject(name, BearerWith(""))));
  EXPECT_EQ((NameId{"aB@c", std::string("urn:oasis:names:tc:SAML:2.0:nameid-format:persistent"),
                    std::string("https://Idp/"), std::string("Sp"), std::string("Own")}),
            AsImpl(*token).GetNameId());
  EXPECT_EQ("{Name: aB@c; Domain:nameid:persistent;name-qualifier=https://%49dp/;sp-name-qualifier=%53p}",
            token->GetSubject().ToString());
}

TEST_F(Saml2VerifierTest, StatesTheIdentifierOfATokenOfTheProfileStrictAsAUserPrincipalName) {
  const std::string strictForm = Assertion({Piece::ISSUER, Piece::SIGNATURE,
                                            Piece::Subject(UPN_NAME, Piece::Confirmation("bearer", Piece::BEARER_DATA)),
                                            Piece::Conditions(""), Piece::AuthnStatement()});
  const auto token = Verify(strictForm, VerifyOptions());
  EXPECT_EQ((NameId{"alice@corp", std::string("http://schemas.xmlsoap.org/claims/UPN"), {}, {}, {}}),
            AsImpl(*token).GetNameId());
  EXPECT_EQ(AsImpl(*token).GetNameId(), AsImpl(*Verify(strictForm)).GetNameId());
}

TEST_F(Saml2VerifierTest, UsesTheFirstBearerThatMatchesTheOptionsOrOtherwiseTheHolderOfKey) {
  const std::string confirmations = Piece::Confirmation("sender-vouches", "") +
                                    Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData()) +
                                    BearerWith(R"(Recipient="https://there/" InResponseTo="_1")") +
                                    BearerWith(R"(Recipient="https://here/" InResponseTo="_2" Address="192.0.2.1")");
  const auto used = [&confirmations](const VerifyOptions &options) {
    return AsImpl(*Verify(AssertionConfirmedBy(confirmations), options)).GetUsedConfirmation();
  };
  VerifyOptions options = Saml2();
  EXPECT_EQ(2u, used(options));
  options.acceptedRecipients = {"https://here/", "https://over-here/"};
  EXPECT_EQ(3u, used(options));
  options.senderAddress = std::string("192.0.2.2");
  EXPECT_EQ(1u, used(options));
  options.senderAddress = std::string("192.0.2.1");
  options.expectedInResponseTo = std::string("_2");
  EXPECT_EQ(3u, used(options));
  options.expectedInResponseTo = std::string("_1");
  EXPECT_EQ(1u, used(options));
  options = Saml2();
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  EXPECT_EQ(1u, used(options));
  options.requiredConfirmation = SamlToken::BEARER;
  options.acceptedRecipients = {"https://nowhere/"};
  ExpectRefusal("The subject confirmation is for another recipient: https://there/",
                AssertionConfirmedBy(confirmations), options);
}

TEST_F(Saml2VerifierTest, HasTheCertificateOfTheHolderOfKeyThatIsUsed) {
  const std::string holderOfKey = Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData());
  const auto token = Verify(AssertionConfirmedBy(holderOfKey));
  ASSERT_NE(nullptr, token->GetConfirmationCertificate());
  EXPECT_EQ(TokenCertificates({"holder"}).front()->GetDer(), token->GetConfirmationCertificate()->GetDer());
  EXPECT_EQ(nullptr, Verify(AssertionConfirmedBy(holderOfKey + BearerWith("")))->GetConfirmationCertificate());
}

TEST_F(Saml2VerifierTest, EndsATokenWhenTheConfirmationOrASessionEnds) {
  const std::string confirmation =
      BearerWith(R"(NotBefore="2026-01-01T00:30:00Z" NotOnOrAfter="2026-01-01T03:00:00Z")");
  auto token = Verify(AssertionConfirmedBy(confirmation));
  EXPECT_EQ(DateTime("2026-01-01T00:30:00Z"), token->GetStartDate());
  EXPECT_EQ(DateTime("2026-01-01T03:00:00Z"), token->GetEndDate());
  token = Verify(Bearer("", Session("2026-01-01T06:00:00Z") + Session("2026-01-01T05:00:00Z")));
  EXPECT_EQ(DateTime("2026-01-01T05:00:00Z"), token->GetEndDate());
}

TEST_F(Saml2VerifierTest, StartsATokenWhenItWasIssuedIfTheConditionsHaveNoStart) {
  const std::string assertion = ReplaceOnce(Bearer(""), " NotBefore=\"2026-01-01T00:00:00Z\"", "");
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), Verify(assertion)->GetStartDate());
  ExpectRefusal(
      "Token start date is in the future: 2026-01-01T01:10:01.000Z",
      ReplaceOnce(assertion, "IssueInstant=\"2026-01-01T00:00:00Z\"", "IssueInstant=\"2026-01-01T01:10:01Z\""));
}

TEST_F(Saml2VerifierTest, RefusesASessionThatHasEnded) {
  ExpectRefusal("The session has ended at: 2026-01-01T00:50:00.000Z", Bearer("", Session("2026-01-01T00:50:00Z")));
  EXPECT_NO_THROW(Verify(Bearer("", Session("2026-01-01T00:50:01Z"))));
}

TEST_F(Saml2VerifierTest, RefusesATokenThatWasChangedAfterItWasSigned) {
  const std::string assertion = SignAgain(AssertionConfirmedBy(BearerWith(R"(Recipient="https://there/")")));
  const TokenVerifier verifier(TokenCertificates(), Saml2());
  EXPECT_NO_THROW(verifier.Verify(assertion));
  EXPECT_THROWS_MESSAGE(verifier.Verify(ReplaceOnce(assertion, "https://there/", "https://heree/")),
                        InvalidSignatureException, "Failed to verify signature: token might have been tampered with.");
  EXPECT_THROW(TokenVerifier(TokenCertificates({"other"}), Saml2()).Verify(assertion), InvalidSignatureException);
}

TEST_F(Saml2VerifierTest, RequiresAnAcceptedAudienceInEachRestriction) {
  VerifyOptions options = Saml2();
  const std::string both = Bearer(Audience("urn:a") + Audience("urn:b"));
  EXPECT_EQ(std::set<std::string>{"(urn:a) and (urn:b)"}, Verify(both)->GetAudience());
  options.acceptedAudiences = {"urn:a", "urn:b"};
  EXPECT_EQ(std::set<std::string>{"(urn:a) and (urn:b)"}, Verify(both, options)->GetAudience());
  EXPECT_EQ(std::set<std::string>{"urn:a"}, Verify(Bearer(Audience("urn:a")), options)->GetAudience());
  options.acceptedAudiences = {"urn:a"};
  ExpectRefusal("The token is restricted to other audiences: urn:b", both, options);
  options.acceptedAudiences = {"(urn:a) and (urn:b)"};
  ExpectRefusal("The token is restricted to other audiences: urn:a", both, options);
  options.acceptUnrestrictedAudience = false;
  ExpectRefusal("The token is not restricted to an audience", Bearer(""), options);
}

TEST_F(Saml2VerifierTest, RefusesATokenWithoutTheRequiredConfirmation) {
  VerifyOptions options = Saml2();
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  ExpectRefusal("The token's confirmation is bearer, but holder-of-key is required",
                AssertionConfirmedBy(BearerWith("")), options);
  options.requiredConfirmation = SamlToken::BEARER;
  ExpectRefusal("The token's confirmation is holder-of-key, but bearer is required",
                AssertionConfirmedBy(Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData())), options);
}

TEST_F(Saml2VerifierTest, ChecksTheFormThenTheRulesThenTheSignatureThenNamesThenAudienceThenConfirmation) {
  VerifyOptions options = Saml2();
  options.acceptedAudiences = {"urn:other"};
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  const std::string group = R"(<saml:AttributeStatement><saml:Attribute Name=")" SSOCLIENT_EXTENSION_AUTHORITY
                            R"(/schemas/attr-names/2009/01/GroupIdentity"><saml:AttributeValue>\</saml:AttributeValue>)"
                            R"(</saml:Attribute></saml:AttributeStatement>)";
  std::string assertion =
      Assertion({Piece::ISSUER, Piece::SIGNATURE, Piece::Subject(UPN_NAME, BearerWith("")),
                 Piece::Conditions(Audience("urn:a")), Session("2026-01-01T00:50:00Z"), group, "<unknown/>"});
  const TokenVerifier verifier(TokenCertificates(), options);
  EXPECT_THROW(verifier.Verify(assertion), ParseException);
  assertion = ReplaceOnce(assertion, "<unknown/>", "");
  EXPECT_THROWS_MESSAGE(verifier.Verify(assertion), ParseException,
                        "The session has ended at: 2026-01-01T00:50:00.000Z");
  assertion = ReplaceOnce(assertion, "SessionNotOnOrAfter=\"2026-01-01T00:50:00Z\" ", "");
  EXPECT_THROW(verifier.Verify(assertion), InvalidSignatureException);
  ExpectRefusal("Failed to parse Group Identity value: `\\'; domain or group missing", assertion, options);
  assertion = ReplaceOnce(assertion, ">\\<", ">users<");
  ExpectRefusal("The token is restricted to other audiences: urn:a", assertion, options);
  options.acceptedAudiences.clear();
  ExpectRefusal("The token's confirmation is bearer, but holder-of-key is required", assertion, options);
  options.requiredConfirmation = boost::none;
  EXPECT_EQ("users", Verify(assertion, options)->GetGroups()[0].name);
}

TEST(TokenVerifierOptions, AreRefusedIfTheProfileStrictCannotFulfilThem) {
  const auto refusal = [](VerifyOptions options) {
    options.profile = TokenProfile::SAML2;
    EXPECT_NO_THROW(TokenVerifier({}, options));
    options.profile = TokenProfile::STRICT;
    try {
      TokenVerifier({}, options);
    } catch (const Tarvel::InvalidArgumentException &error) {
      return std::string(error.what());
    }
    return std::string();
  };
  VerifyOptions options;
  EXPECT_EQ("", refusal(options));
  options.acceptedRecipients = {""};
  EXPECT_EQ("Invalid argument : VerifyOptions::acceptedRecipients needs the profile SAML2", refusal(options));
  options = {};
  options.expectedInResponseTo = std::string();
  EXPECT_EQ("Invalid argument : VerifyOptions::expectedInResponseTo needs the profile SAML2", refusal(options));
  options = {};
  options.senderAddress = std::string();
  EXPECT_EQ("Invalid argument : VerifyOptions::senderAddress needs the profile SAML2", refusal(options));
}

} // namespace
