// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_verifier.h>

#include "support/data_file.h"
#include "support/facts_of.h"
#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "unit/token/assertion_text.h"
#include "unit/token/signed_assertion.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <tarvel/core/environment.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <string>
#include <thread>
#include <typeinfo>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::Crypto::CertificateList;
using Tarvel::System::DateTime;

constexpr const char *TAMPERED = "Failed to verify signature: token might have been tampered with.";
constexpr const char *FILES = "https://files.corp.example/";
constexpr const char *MAIL = "https://mail.corp.example/";

/// In all of these tests the time is 2026-01-02T03:04:05Z.
class TokenVerifierTest : public ::testing::Test {
protected:
  static VerifyOptions ForAudiences(const std::set<std::string> &audiences) {
    VerifyOptions options;
    options.acceptedAudiences = audiences;
    return options;
  }

  static VerifyOptions Requiring(SamlToken::ConfirmationType confirmation) {
    VerifyOptions options;
    options.requiredConfirmation = confirmation;
    return options;
  }

  static std::shared_ptr<const SamlToken> Verify(const std::string &xml, const VerifyOptions &options = {}) {
    return TokenVerifier(TokenCertificates(), options).Verify(xml);
  }

private:
  Tarvel::ScopedEnvironment m_clock{{[] { return DateTime("2026-01-02T03:04:05Z").GetUtcTime(); }, {}}};
};

/// What a verification does: the facts and the text of the token, or class and text of the exception.
template <typename MakeToken>
std::string OutcomeOf(const MakeToken &makeToken) {
  try {
    const auto token = makeToken();
    return FactsOf(*token) + token->ToXml();
  } catch (const Tarvel::Exception &error) {
    return std::string(typeid(error).name()) + ": " + error.what();
  }
}

std::vector<std::string> AllFixtures() {
  std::vector<std::string> names;
  for (const auto &entry : std::filesystem::directory_iterator(DataPath("tokens"))) {
    if (entry.path().extension() == ".xml") {
      names.push_back(entry.path().stem());
    }
  }
  return names;
}

TEST_F(TokenVerifierTest, DoesWhatCreateSamlTokenDoesWithEveryFixture) {
  const std::vector<CertificateList> trustSets{
      {}, TokenCertificates(), TokenCertificates({"sts-rsa-2", "sts-ec256", "sts-rsa", "sts-rsa3072", "sts-rsa1024"})};
  const std::vector<std::string> names = AllFixtures();
  ASSERT_GT(names.size(), 30u);
  for (const CertificateList &trusted : trustSets) {
    const TokenVerifier verifier(trusted);
    for (const std::string &name : names) {
      SCOPED_TRACE(name);
      const std::string xml = TokenFixture(name);
      const ParsedDocument document(xml);
      EXPECT_EQ(OutcomeOf([&] { return CreateSamlToken(xml, trusted); }),
                OutcomeOf([&] { return verifier.Verify(xml); }));
      EXPECT_EQ(OutcomeOf([&] { return CreateSamlTokenFromDom(document.Root(), trusted); }),
                OutcomeOf([&] { return verifier.Verify(document.Root()); }));
    }
  }
}

TEST_F(TokenVerifierTest, IgnoresNullCertificatesAndAcceptsNothingWithoutACertificate) {
  CertificateList trusted = TokenCertificates();
  trusted.insert(trusted.begin(), nullptr);
  EXPECT_NO_THROW(TokenVerifier(trusted).Verify(TokenFixture("bearer")));
  EXPECT_THROWS_MESSAGE(TokenVerifier(CertificateList()).Verify(TokenFixture("bearer")), InvalidSignatureException,
                        "Signature verification error. No trusted key can be used with the signature algorithm "
                        "\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"");
}

TEST_F(TokenVerifierTest, KeepsItsKeysAndOptionsWhenItIsCopiedAndTheOriginalIsDestroyed) {
  const auto copyOfTemporary = [] {
    const TokenVerifier original(TokenCertificates(), ForAudiences({"urn:other"}));
    return TokenVerifier(original); // NOLINT(performance-no-automatic-move): the copy is what is tested
  };
  const TokenVerifier copy = copyOfTemporary();
  EXPECT_NO_THROW(copy.Verify(TokenFixture("bearer-minimal")));
  EXPECT_THROW(copy.Verify(TokenFixture("bearer")), ParseException);
}

TEST_F(TokenVerifierTest, ServesSeveralThreadsAtOnce) {
  const TokenVerifier verifier(TokenCertificates({"other", "sts-rsa-2", "sts-rsa"}));
  const std::string accepted = TokenFixture("bearer");
  const std::string refused = TokenFixture("expired");
  std::atomic<int> right{0};
  const auto work = [&] {
    const bool isAccepted = verifier.Verify(accepted)->GetSubject().name == "alice";
    right += isAccepted && verifier.Explain(accepted).accepted && !verifier.Explain(refused).accepted ? 1 : 0;
  };
  std::vector<std::thread> threads;
  for (int index = 0; index < 4; ++index) {
    threads.emplace_back(work);
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(4, right);
}

TEST_F(TokenVerifierTest, ToleratesAClockThatIsWrongByTheTolerance) {
  VerifyOptions options;
  EXPECT_EQ(600, options.clockToleranceSec);
  options.clockToleranceSec = std::int64_t{100} * 366 * 86400;
  EXPECT_NO_THROW(Verify(TokenFixture("expired"), options));
  EXPECT_THROWS_MESSAGE(Verify(TokenFixture("expired")), ParseException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
}

TEST_F(TokenVerifierTest, AcceptsATokenForOneOfTheAcceptedAudiences) {
  EXPECT_NO_THROW(Verify(TokenFixture("bearer"), ForAudiences({MAIL})));
  EXPECT_NO_THROW(Verify(TokenFixture("bearer"), ForAudiences({FILES})));
  EXPECT_NO_THROW(Verify(TokenFixture("bearer"), ForAudiences({"urn:other", MAIL})));
}

TEST_F(TokenVerifierTest, RefusesATokenThatIsRestrictedToOtherAudiences) {
  const std::string message = "The token is restricted to other audiences: "
                              "https://files.corp.example/, https://mail.corp.example/";
  for (const std::string audience : {"", "urn:other", "https://mail.corp.example", "HTTPS://mail.corp.example/",
                                     "https://mail.corp.example/ ", "https://mail.corp.example/inbox"}) {
    EXPECT_THROWS_MESSAGE(Verify(TokenFixture("bearer"), ForAudiences({audience})), ParseException, message);
  }
}

TEST_F(TokenVerifierTest, ChecksTheAudienceOfATokenFromATree) {
  const ParsedDocument document(TokenFixture("bearer"));
  EXPECT_NO_THROW(TokenVerifier(TokenCertificates(), ForAudiences({MAIL})).Verify(document.Root()));
  EXPECT_THROW(TokenVerifier(TokenCertificates(), ForAudiences({"urn:other"})).Verify(document.Root()), ParseException);
}

TEST_F(TokenVerifierTest, AcceptsAnUnrestrictedTokenUnlessTheOptionsRefuseIt) {
  VerifyOptions options = ForAudiences({MAIL});
  EXPECT_NO_THROW(Verify(TokenFixture("bearer-minimal"), options));
  options.acceptUnrestrictedAudience = false;
  EXPECT_NO_THROW(Verify(TokenFixture("bearer"), options));
  EXPECT_THROWS_MESSAGE(Verify(TokenFixture("bearer-minimal"), options), ParseException,
                        "The token is not restricted to an audience");
}

TEST_F(TokenVerifierTest, CanBeUsedAfterItWasMovedFrom) {
  TokenVerifier first(TokenCertificates());
  const TokenVerifier second(std::move(first));
  EXPECT_NO_THROW(first.Verify(TokenFixture("bearer"))); // NOLINT(bugprone-use-after-move): promised
  TokenVerifier third({});
  third = std::move(first);
  EXPECT_NO_THROW(first.Verify(TokenFixture("bearer"))); // NOLINT(bugprone-use-after-move): promised
  EXPECT_NO_THROW(second.Verify(TokenFixture("bearer")));
  EXPECT_NO_THROW(third.Verify(TokenFixture("bearer")));
}

TEST_F(TokenVerifierTest, DoesNotCheckTheAudienceWithoutAcceptedAudiences) {
  VerifyOptions options;
  options.acceptUnrestrictedAudience = false;
  EXPECT_NO_THROW(Verify(TokenFixture("bearer"), options));
  EXPECT_NO_THROW(Verify(TokenFixture("bearer-minimal"), options));
}

TEST_F(TokenVerifierTest, AcceptsOnlyTheRequiredConfirmation) {
  EXPECT_NO_THROW(Verify(TokenFixture("bearer"), Requiring(SamlToken::BEARER)));
  EXPECT_NO_THROW(Verify(TokenFixture("holder-of-key"), Requiring(SamlToken::HOLDER_OF_KEY)));
  EXPECT_THROWS_MESSAGE(Verify(TokenFixture("bearer"), Requiring(SamlToken::HOLDER_OF_KEY)), ParseException,
                        "The token's confirmation is bearer, but holder-of-key is required");
  EXPECT_THROWS_MESSAGE(Verify(TokenFixture("holder-of-key"), Requiring(SamlToken::BEARER)), ParseException,
                        "The token's confirmation is holder-of-key, but bearer is required");
}

TEST_F(TokenVerifierTest, ChecksSignatureThenNamesThenAudienceThenConfirmation) {
  VerifyOptions options = ForAudiences({"urn:other"});
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  const std::string unnamed = ReplaceOnce(TokenFixture("bearer"), ">alice@corp.example<", ">alice<");
  EXPECT_THROWS_MESSAGE(Verify(unnamed, options), InvalidSignatureException, TAMPERED);
  EXPECT_THROWS_MESSAGE(Verify(SignAgain(unnamed), options), ParseException,
                        "Failed to parse the UPN NameID: `alice'; name or domain part is missing.");
  EXPECT_THROWS_MESSAGE(Verify(TokenFixture("bearer"), options), ParseException,
                        "The token is restricted to other audiences: "
                        "https://files.corp.example/, https://mail.corp.example/");
  options.acceptedAudiences.insert(MAIL);
  EXPECT_THROWS_MESSAGE(Verify(TokenFixture("bearer"), options), ParseException,
                        "The token's confirmation is bearer, but holder-of-key is required");
}

} // namespace
