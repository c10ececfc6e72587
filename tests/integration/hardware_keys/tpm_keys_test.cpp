// SPDX-License-Identifier: Apache-2.0
// Keys that cannot leave a TPM sign like others: octets, requests for tokens, and everything that needs a token's key.
#include "software_tpm.h"

#include "support/dev_sts.h"
#include "support/throws_message.h"

#include <ssoclient/proof/http_proof.h>
#include <ssoclient/proof/message_verifier.h>
#include <ssoclient/proof/sign_http_request.h>
#include <ssoclient/proof/sign_message.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/crypto/detached_signature.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/crypto/system_configuration.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/ssl/ssl_context.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace Testing {
namespace {

using namespace Tarvel::Crypto;

/// Everything that the tests use. OpenSSL reads its configuration once in a process, so there is one object for all tests.
class World {
public:
  World() {
    m_rsa = m_tpm.MakeKey("rsa2048");
    m_ec = m_tpm.MakeKey("ecc256");
    m_others = {m_tpm.MakeKey("ecc256"), m_tpm.MakeKeyFile()};
    m_certificateFile =
        m_tpm.IssueCertificate(m_rsa, m_service.PathOf("authority.crt"), m_service.PathOf("authority.key"));
    m_tpm.SetEnvironment();
    UseSystemConfiguration();
  }

  ~World() {
    unsetenv("OPENSSL_CONF");
    unsetenv("TPM2OPENSSL_TCTI");
  }

  std::string m_rsa;
  std::string m_ec;
  std::vector<std::string> m_others; ///< a key in the TPM, and one in a file
  std::string m_certificateFile;
  const DevSts m_service; // started before the environment refers to the TPM, which would wait for this process
  SoftwareTpm m_tpm;
};

class KeyInATpm : public ::testing::Test {
protected:
  static void SetUpTestSuite() {
    if (SoftwareTpm::FindMissing().empty()) {
      s_world = std::make_unique<World>();
    }
  }

  static void TearDownTestSuite() { s_world.reset(); }

  void SetUp() override {
    if (!s_world) {
      GTEST_SKIP() << SoftwareTpm::FindMissing();
    }
  }

  static Tarvel::Ref<const PrivateKey> Rsa() { return LoadPrivateKey(s_world->m_rsa); }
  static Tarvel::Ref<const PrivateKey> Ec() { return LoadPrivateKey(s_world->m_ec); }
  static Tarvel::Ref<const Certificate> ClientCertificate() {
    return LoadCertificates(s_world->m_certificateFile).front();
  }

  static SsoClient::HolderOfKeyConfig Identity() { return {Rsa(), ClientCertificate()}; }

  static CertificateList Signers() { return LoadCertificates(s_world->m_service.PathOf("signing.crt")); }

  static std::shared_ptr<const SsoClient::SecurityTokenService> Service() {
    static const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
    context->TrustFile(s_world->m_service.PathOf("authority.crt"));
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = s_world->m_service.GetUrl();
    config.sslContext = context.get();
    config.signingCertificates = Signers();
    config.holderOfKeyConfig = Identity();
    return SsoClient::CreateSecurityTokenService(config);
  }

  static SsoClient::TokenSpec Spec() {
    SsoClient::TokenSpec spec;
    spec.tokenLifetimeSec = 3600;
    spec.renewable = true;
    return spec;
  }

  static std::unique_ptr<World> s_world;
};

std::unique_ptr<World> KeyInATpm::s_world;

/// Whether a signature by `key` is accepted, and the signature over other octets is not.
bool Signs(const PrivateKey &key, HashAlgorithm algorithm) {
  const Tarvel::Ref<const VerifyingKey> publicKey = CreateVerifyingKey(key);
  const std::vector<std::uint8_t> signature = SignOctets(key, algorithm, "octets");
  return VerifyOctets(*publicKey, algorithm, "octets", signature) &&
         !VerifyOctets(*publicKey, algorithm, "octetS", signature);
}

TEST_F(KeyInATpm, IsLoadedByItsHandle) {
  EXPECT_EQ(Rsa()->GetAlgorithm(), "RSA");
  EXPECT_EQ(Rsa()->GetBits(), 2048u);
  EXPECT_EQ(Ec()->GetAlgorithm(), "EC");
  EXPECT_EQ(Ec()->GetBits(), 256u);
}

TEST_F(KeyInATpm, SignsOctets) {
  EXPECT_TRUE(Signs(*Rsa(), HashAlgorithm::SHA256));
  EXPECT_TRUE(Signs(*Rsa(), HashAlgorithm::SHA384));
  EXPECT_TRUE(Signs(*Ec(), HashAlgorithm::SHA256));
}

TEST_F(KeyInATpm, IsComparedWithCertificates) {
  EXPECT_NO_THROW(RequireKeyMatchesCertificate(*Rsa(), *ClientCertificate()));
  EXPECT_THROWS_MESSAGE(RequireKeyMatchesCertificate(*Ec(), *ClientCertificate()), KeyMismatchException,
                        "The private key does not belong to the certificate CN=client,O=corp.example");
  EXPECT_TRUE(IsSameKey(*CreateVerifyingKey(*Rsa()), *CreateVerifyingKey(ClientCertificate())));
  EXPECT_EQ(CreateVerifyingKey(*Rsa())->GetSubjectPublicKey(),
            CreateVerifyingKey(ClientCertificate())->GetSubjectPublicKey());
}

TEST_F(KeyInATpm, IsLoadedAndSignsOnSeveralThreads) {
  // Each thread has a key of its own, which two of them load again and again. No key is loaded twice at the same time: the
  // provider releases both when one is released.
  const Tarvel::Ref<const PrivateKey> rsa = Rsa();
  const Tarvel::Ref<const PrivateKey> ec = Ec();
  const auto getKey = [&](int thread) {
    return thread == 0   ? rsa
           : thread == 1 ? ec
                         : LoadPrivateKey(s_world->m_others.at(static_cast<std::size_t>(thread) - 2));
  };
  std::atomic<int> failures = 0;
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&, i] {
      for (int turn = 0; turn < 10; ++turn) {
        failures += Signs(*getKey(i), HashAlgorithm::SHA256) ? 0 : 1;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(failures, 0);
}

TEST_F(KeyInATpm, AcquiresAndRenewsTokens) {
  const auto service = Service();
  const auto token = service->AcquireTokenByCertificate(Spec());
  ASSERT_TRUE(token->GetConfirmationCertificate());
  EXPECT_EQ(token->GetConfirmationCertificate()->GetSha256Thumbprint(), ClientCertificate()->GetSha256Thumbprint());
  const auto renewed = service->RenewToken(*token, 3600);
  EXPECT_NE(renewed->GetId(), token->GetId());
  EXPECT_TRUE(IsSameKey(*CreateVerifyingKey(*Rsa()),
                        *CreateVerifyingKey(Tarvel::Ref<const Certificate>(renewed->GetConfirmationCertificate()))));
}

TEST_F(KeyInATpm, SignsMessages) {
  const auto token = Service()->AcquireTokenByCertificate(Spec());
  const std::string message = SsoClient::SignMessage(
      "<s:Envelope xmlns:s='http://www.w3.org/2003/05/soap-envelope'><s:Body><read/></s:Body></s:Envelope>", *token,
      *Rsa());
  const SsoClient::MessageVerifier verifier{SsoClient::TokenVerifier(Signers())};
  const SsoClient::VerifiedMessage verified = verifier.Verify(message);
  EXPECT_EQ(verified.proof, SsoClient::ProofKind::MESSAGE_SIGNATURE);
  EXPECT_EQ(verified.token->GetId(), token->GetId());
  EXPECT_TRUE(verified.IsCovered(*verified.body));
}

TEST_F(KeyInATpm, SignsHttpRequests) {
  const auto token = Service()->AcquireTokenByCertificate(Spec());
  SsoClient::HttpRequest request{"POST", "https://files.corp.example/read", {}, std::string("content")};
  for (const auto &field : SsoClient::SignHttpRequest(request, *token, *Rsa())) {
    request.headers.push_back(field);
  }
  const SsoClient::VerifiedHttpRequest verified =
      SsoClient::VerifyHttpProof(request, SsoClient::TokenVerifier(Signers()));
  EXPECT_EQ(verified.proof, SsoClient::ProofKind::MESSAGE_SIGNATURE);
  EXPECT_EQ(verified.token->GetId(), token->GetId());
}

TEST_F(KeyInATpm, IsReportedWhenItIsMissing) {
  try {
    LoadPrivateKey("handle:0x81000099");
    FAIL();
  } catch (const CryptoException &error) {
    EXPECT_EQ(std::string(error.what()).rfind("handle:0x81000099: The key store cannot be read: error:", 0), 0u)
        << std::string(error.what());
  }
}

} // namespace
} // namespace Testing
