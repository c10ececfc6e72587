// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/proof_kind.h>
#include <ssoclient/proof/tls_proof.h>

#include "support/data_file.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <ssoclient/token_verifier.h>
#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace {

using namespace SsoClient;
using Testing::TokenStandIn;

Tarvel::Ref<const Tarvel::Crypto::Certificate> CertificateOf(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath(name + ".crt")).front();
}

constexpr const char *OTHER_KEY = "The key of the TLS certificate is not the key of the token";

TEST(VerifyTlsProof, AcceptsTheCertificateOfTheToken) {
  const auto holder = CertificateOf("tokens/holder");
  EXPECT_NO_THROW(VerifyTlsProof(TokenStandIn("_1", "<a/>", SamlToken::HOLDER_OF_KEY, holder), *holder));
}

TEST(VerifyTlsProof, AcceptsAnotherCertificateOfTheSameKey) {
  const TokenStandIn token("_1", "<a/>", SamlToken::HOLDER_OF_KEY, CertificateOf("tokens/sts-rsa"));
  EXPECT_NO_THROW(VerifyTlsProof(token, *CertificateOf("tokens/sts-rsa-reissued")));
}

TEST(VerifyTlsProof, AcceptsKeysWithWhichNoSignatureIsAccepted) {
  const auto certificate = CertificateOf("crypto/ed25519");
  EXPECT_NO_THROW(VerifyTlsProof(TokenStandIn("_1", "<a/>", SamlToken::HOLDER_OF_KEY, certificate), *certificate));
}

TEST(VerifyTlsProof, AcceptsTheKeyValueOfTheToken) {
  VerifyOptions options;
  options.profile = TokenProfile::SAML2;
  const auto token = TokenVerifier({CertificateOf("tokens/sts-rsa")}, options)
                         .Verify(Testing::ReadDataFile("saml2/holder-rsa-value.xml"));
  EXPECT_NO_THROW(VerifyTlsProof(*token, *CertificateOf("tokens/holder")));
  EXPECT_THROWS_MESSAGE(VerifyTlsProof(*token, *CertificateOf("tokens/other")), InvalidProofException, OTHER_KEY);
}

TEST(VerifyTlsProof, RefusesAnotherKey) {
  const TokenStandIn token("_1", "<a/>", SamlToken::HOLDER_OF_KEY, CertificateOf("tokens/holder"));
  EXPECT_THROWS_MESSAGE(VerifyTlsProof(token, *CertificateOf("tokens/other")), InvalidProofException, OTHER_KEY);
  EXPECT_THROWS_MESSAGE(VerifyTlsProof(token, *CertificateOf("crypto/p256")), InvalidProofException, OTHER_KEY);
}

TEST(VerifyTlsProof, RefusesTokensWithoutAKey) {
  EXPECT_THROWS_MESSAGE(
      VerifyTlsProof(TokenStandIn("_1", "<a/>", SamlToken::HOLDER_OF_KEY), *CertificateOf("tokens/holder")),
      InvalidProofException, OTHER_KEY);
}

TEST(VerifyTlsProof, RefusesBearerTokens) {
  EXPECT_THROWS_MESSAGE(VerifyTlsProof(TokenStandIn("_1", "<a/>", SamlToken::BEARER), *CertificateOf("tokens/holder")),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : a bearer token has no key that its sender could prove");
}

TEST(GetProofName, IsTheNameOfTheProof) {
  EXPECT_STREQ("bearer", GetProofName(ProofKind::BEARER));
  EXPECT_STREQ("message-signature", GetProofName(ProofKind::MESSAGE_SIGNATURE));
  EXPECT_STREQ("tls-certificate", GetProofName(ProofKind::TLS_CERTIFICATE));
  EXPECT_STREQ("unknown", GetProofName(static_cast<ProofKind>(7)));
}

} // namespace
