// SPDX-License-Identifier: Apache-2.0

#include "documents.h"
#include "support/throws_message.h"

#include <tarvel/core/exception.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <ostream>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::Xml::Security::CreateTrustSetKeyResolver;
using Tarvel::Xml::Security::XmlSecurityException;
using Testing::FindElement;
using Testing::ParseDocument;
using Testing::ReadFixture;
using Testing::Replaced;
using Testing::SignatureOf;
using Testing::Trusted;
using Testing::VerifyText;

struct SignedFixture {
  const char *name;
  const char *certificate;
};

void PrintTo(const SignedFixture &fixture, std::ostream *out) {
  *out << fixture.name;
}

// Signed by xmlsec1, those with RSA-PSS by openssl.
constexpr SignedFixture SIGNED_FIXTURES[] = {
    {"rsa-sha256", "sts-rsa"},
    {"rsa-sha384", "sts-rsa"},
    {"rsa-sha512", "sts-rsa"},
    {"rsa-pss-sha256", "sts-rsa"},
    {"rsa-pss-sha384", "sts-rsa"},
    {"rsa-pss-sha512", "sts-rsa"},
    {"rsa3072", "sts-rsa3072"},
    {"ecdsa-p256-sha256", "sts-ec256"},
    {"ecdsa-p256-sha384", "sts-ec256"},
    {"ecdsa-p256-sha512", "sts-ec256"},
    {"ecdsa-p384-sha256", "sts-ec384"},
    {"ecdsa-p384-sha384", "sts-ec384"},
    {"ecdsa-p384-sha512", "sts-ec384"},
    {"ecdsa-p521-sha256", "sts-ec521"},
    {"ecdsa-p521-sha384", "sts-ec521"},
    {"ecdsa-p521-sha512", "sts-ec521"},
    {"c14n-exclusive-with-comments", "sts-rsa"},
    {"c14n-inclusive", "sts-rsa"},
    {"c14n-inclusive-with-comments", "sts-rsa"},
    {"c14n-inclusive-prefixes", "sts-rsa"},
    {"c14n-mixed", "sts-rsa"},
    {"reference-empty-uri", "sts-rsa"},
    {"reference-two", "sts-rsa"},
};

class VerifyFixture : public ::testing::TestWithParam<SignedFixture> {
protected:
  std::string Text() const { return ReadFixture(std::string("tokens/") + GetParam().name + ".xml"); }
};

TEST_P(VerifyFixture, AcceptsWhatOthersSigned) {
  EXPECT_TRUE(VerifyText(Text(), {GetParam().certificate}));
}

TEST_P(VerifyFixture, AnswersFalseWhenContentWasChanged) {
  EXPECT_FALSE(VerifyText(Replaced(Text(), "alice", "malice"), {GetParam().certificate}));
}

TEST_P(VerifyFixture, AnswersFalseWhenTheSignatureValueWasChanged) {
  std::string text = Text();
  const std::size_t value = text.find("SignatureValue>") + 20;
  text[value] = text[value] == 'A' ? 'B' : 'A';
  EXPECT_FALSE(VerifyText(text, {GetParam().certificate}));
}

TEST_P(VerifyFixture, FindsTheKeyAmongAllTrustedOnes) {
  EXPECT_TRUE(
      VerifyText(Text(), {"other", "sts-rsa-2", "sts-ec521", "sts-ec384", "sts-ec256", "sts-rsa3072", "sts-rsa"}));
}

INSTANTIATE_TEST_SUITE_P(Verify, VerifyFixture, ::testing::ValuesIn(SIGNED_FIXTURES));

} // namespace
