// SPDX-License-Identifier: Apache-2.0
// The counterpart of the attacks: every genuine token, in every way of writing, canonicalising and signing that the
// profile allows, is accepted, except the few with a correct signature that must be refused for another reason.

#include "outcome.h"

#include "support/data_file.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <string>

namespace Attacks {
namespace {

constexpr const char *CHANGED = "Failed to verify signature: token might have been tampered with.";

TEST(GenuineTokens, AreAcceptedUnlessOutOfDateOrSignedWithAnUntrustedKey) {
  const std::map<std::string, Outcome> refused = {
      {"expired", {"ParseException", "The token has expired at: 2021-01-01T00:00:00.000Z"}},
      {"early", {"ParseException", "Token start date is in the future: 2110-01-01T00:00:00.000Z"}},
      {"signed-by-other", {"InvalidSignatureException", CHANGED}},
      {"signed-by-second", {"InvalidSignatureException", CHANGED}},
      {"rsa1024",
       {"InvalidSignatureException", "Signature verification error. No trusted key can be used with the signature "
                                     "algorithm \"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\""}},
  };
  int accepted = 0;
  for (const auto &entry : std::filesystem::directory_iterator(Testing::DataPath("tokens"))) {
    if (entry.path().extension() != ".xml") {
      continue;
    }
    const std::string name = entry.path().stem();
    const Outcome outcome = TryToken(ReadToken(name));
    const auto expected = refused.find(name);
    if (expected != refused.end()) {
      EXPECT_EQ(expected->second, outcome) << name;
      continue;
    }
    EXPECT_TRUE(outcome.IsAccepted()) << name << ": " << outcome;
    ++accepted;
  }
  EXPECT_EQ(34, accepted);
}

TEST(GenuineTokens, HaveTheSameFactsInEveryWayOfWriting) {
  const auto withoutId = [](const Outcome &outcome) { return outcome.text.substr(outcome.text.find('\n')); };
  const std::string expected = withoutId(TryToken(ReadToken("full")));
  for (const char *name : {"c14n-inclusive", "c14n-inclusive-with-comments", "c14n-exclusive-with-comments",
                           "c14n-inclusive-prefixes", "c14n-mixed", "style-default-namespace", "style-prefixes-on-root",
                           "style-prefixes-on-root-inclusive", "style-pretty"}) {
    EXPECT_EQ(expected, withoutId(TryToken(ReadToken(name)))) << name;
  }
}

TEST(GenuineTokens, SignedWithARetiredCertificateOfATrustedKeyAreAccepted) {
  const Tarvel::Crypto::CertificateList reissued = {
      Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tokens/sts-rsa-reissued.crt"))};
  EXPECT_EQ("alice", SsoClient::CreateSamlToken(ReadToken("bearer"), reissued)->GetSubject().name);
}

TEST(GenuineTokens, AreRefusedWithoutTrustedCertificates) {
  try {
    SsoClient::CreateSamlToken(ReadToken("bearer"), Tarvel::Crypto::CertificateList());
    FAIL() << "accepted";
  } catch (const SsoClient::InvalidSignatureException &failure) {
    EXPECT_EQ(0u, std::string(failure.what()).find("Signature verification error. ")) << failure.what();
  }
}

TEST(GenuineTokens, SignedWithAShortRsaKeyAreRefusedForThatReason) {
  const Tarvel::Crypto::CertificateList shortKey = {
      Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tokens/sts-rsa1024.crt"))};
  try {
    SsoClient::CreateSamlToken(ReadToken("rsa1024"), shortKey);
    FAIL() << "accepted";
  } catch (const SsoClient::InvalidSignatureException &failure) {
    EXPECT_EQ(0u, std::string(failure.what()).find("Signature verification error. ")) << failure.what();
  }
}

} // namespace
} // namespace Attacks
