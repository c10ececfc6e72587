// SPDX-License-Identifier: Apache-2.0

#include "token/confirmation_key.h"

#include "support/data_file.h"
#include "support/token_stand_in.h"
#include "unit/token/signed_assertion.h"

#include <ssoclient/token_details.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/subject_public_key.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::Ref;
using Tarvel::Crypto::VerifyingKey;

std::shared_ptr<const SamlToken> VerifiedSaml2(const std::string &name) {
  VerifyOptions options;
  options.profile = TokenProfile::SAML2;
  return TokenVerifier(TokenCertificates(), options).Verify(ReadDataFile("saml2/" + name + ".xml"));
}

TEST(GetConfirmationKey, IsTheKeyOfTheCertificate) {
  const Ref<const VerifyingKey> key =
      GetConfirmationKey(*TokenVerifier(TokenCertificates()).Verify(TokenFixture("holder-of-key")));
  ASSERT_TRUE(key);
  EXPECT_EQ(Tarvel::Crypto::GetSubjectPublicKey(*TokenCertificates({"holder"}).front()), key->GetSubjectPublicKey());
}

TEST(GetConfirmationKey, IsTheKeyValueOfTheConfirmation) {
  for (const std::string name : {"holder-rsa-value", "holder-ec-value", "holder-ec384-value", "holder-certificate",
                                 "holder-certificate-and-value", "wss4j-holder-key-value"}) {
    const std::shared_ptr<const SamlToken> token = VerifiedSaml2(name);
    const TokenDetails details = GetTokenDetails(*token);
    const Ref<const VerifyingKey> key = GetConfirmationKey(*token);
    ASSERT_TRUE(key) << name;
    EXPECT_EQ(details.confirmations.at(details.usedConfirmation).publicKey, key->GetSubjectPublicKey()) << name;
  }
}

TEST(GetConfirmationKey, IsNullForBearerTokens) {
  EXPECT_FALSE(GetConfirmationKey(*TokenVerifier(TokenCertificates()).Verify(TokenFixture("bearer"))));
}

TEST(GetConfirmationKey, IsNotThatOfAConfirmationThatIsNotUsed) {
  const std::shared_ptr<const SamlToken> token = VerifiedSaml2("confirmations-holder-and-bearer");
  ASSERT_EQ(SamlToken::BEARER, token->GetConfirmationMethod());
  EXPECT_FALSE(GetConfirmationKey(*token));
}

TEST(GetConfirmationKey, UsesTheCertificateOfTokensOfOtherImplementations) {
  const auto certificate = TokenCertificates({"holder"}).front();
  const Ref<const VerifyingKey> key =
      GetConfirmationKey(TokenStandIn("_1", "<a/>", SamlToken::HOLDER_OF_KEY, certificate));
  ASSERT_TRUE(key);
  EXPECT_EQ(Tarvel::Crypto::GetSubjectPublicKey(*certificate), key->GetSubjectPublicKey());
  EXPECT_FALSE(GetConfirmationKey(TokenStandIn("_1", "<a/>", SamlToken::BEARER, certificate)));
  EXPECT_FALSE(GetConfirmationKey(TokenStandIn("_1", "<a/>", SamlToken::HOLDER_OF_KEY)));
}

} // namespace
