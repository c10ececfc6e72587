// SPDX-License-Identifier: Apache-2.0
// The library's own client against the development service: what is issued says what was asked for.

#include "support/dev_sts.h"

#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <ssoclient/security_token_service_config.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/ssl/ssl_context.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>

namespace {

using SsoClient::SamlToken;
using SsoClient::TokenSpec;
using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;

/// A client of a running service.
class Operations : public testing::Test {
protected:
  std::shared_ptr<const SsoClient::SecurityTokenService> Client(const char *identity) {
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = m_service.GetUrl();
    config.signingCertificates = {Tarvel::Crypto::CreateCertificateFromPem(m_service.ReadStateFile("signing.crt"))};
    m_tls->TrustFile(m_service.PathOf("authority.crt"));
    config.sslContext = m_tls.get();
    if (identity) {
      const std::string name(identity);
      config.holderOfKeyConfig = SsoClient::HolderOfKeyConfig{
          Tarvel::Crypto::CreatePrivateKey(m_service.ReadStateFile(name + ".key")),
          Tarvel::Crypto::CreateCertificateFromPem(m_service.ReadStateFile(name + ".crt"))};
    }
    return SsoClient::CreateSecurityTokenService(config);
  }

  static TokenSpec Spec() {
    TokenSpec spec;
    spec.tokenLifetimeSec = 3600;
    return spec;
  }

  Testing::DevSts m_service;
  Tarvel::Ref<Tarvel::Ssl::SSLContext> m_tls = Tarvel::Ssl::CreateSSLContext();
};

TEST_F(Operations, PasswordGivesABearerTokenOfTheUser) {
  const auto token = Client(nullptr)->AcquireToken("alice@corp.example", "wonderland", Spec());
  EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::BEARER);
  EXPECT_EQ(token->GetSubject().name, "alice");
}

TEST_F(Operations, CertificateRenewExchangeValidate) {
  const auto client = Client("client");
  TokenSpec spec = Spec();
  spec.renewable = true;
  spec.delegable = true;
  const auto token = client->AcquireTokenByCertificate(spec);
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_TRUE(token->IsSolution());
  const auto renewed = client->RenewToken(*token, 7200);
  spec.delegateTo = std::string("bob@corp.example");
  spec.audienceRestriction = {"https://a.example/"};
  const auto exchanged = client->AcquireTokenByToken(*renewed, spec);
  EXPECT_TRUE(client->ValidateSubject(*exchanged));
}

TEST(DevStsLife, EndsAtSigtermWithZero) {
  Testing::DevSts service;
  const Testing::ProcessEnd end = service.End(SIGTERM);
  EXPECT_EQ(end.exitCode, 0);
  EXPECT_EQ(end.out, "");
}

TEST(DevStsLife, EndsWhenItsStandardInputEnds) {
  Testing::DevSts service;
  EXPECT_EQ(service.End().exitCode, 0);
}

} // namespace
