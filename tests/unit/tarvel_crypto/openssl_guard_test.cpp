// SPDX-License-Identifier: Apache-2.0
// Keys and certificates in use on detached threads while the process ends.

#include "crypto/openssl_guard.h"

#include "crypto/passphrase.h"
#include "crypto/public_key.h"
#include "fixtures.h"
#include "support/process_resources.h"
#include "system/thread_pool.h"

#include <tarvel/crypto/system_configuration.h>

#include <gtest/gtest.h>
#include <openssl/crypto.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <functional>
#include <future>
#include <iostream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace Tarvel::Crypto {
namespace {

constexpr std::array<std::uint8_t, MAX_DIGEST_BYTES> DIGEST{};

/// What a thread does with a token: reads the certificate in it, checks its signature, and signs with it.
class TokenWork {
public:
  void Run() const {
    const auto value = SignDigest(*m_key, SignatureScheme::RSA_PKCS1, DigestAlgorithm::SHA256, DIGEST.data());
    Verify(*ReadCertificate(), value);
  }

  Ref<const Certificate> ReadCertificate() const {
    const auto &der = m_certificate->GetDer();
    return CreateCertificateFromDer(der.data(), der.size());
  }

  void Verify(const Certificate &certificate, const std::vector<std::uint8_t> &value) const {
    VerifyDigest(certificate, SignatureScheme::RSA_PKCS1, DigestAlgorithm::SHA256, DIGEST.data(), value.data(),
                 value.size());
  }

  void RequireMatch() const { RequireKeyMatchesCertificate(*m_key, *m_certificate); }

  const Certificate &GetCertificate() const { return *m_certificate; }

private:
  Ref<const Certificate> m_certificate = Testing::FixtureCertificate("rsa2048");
  Ref<const PrivateKey> m_key = Testing::FixtureKey("rsa2048");
};

void EndWhileBusy() {
  static std::atomic<int> rounds{0};
  const auto work = std::make_shared<const TokenWork>();
  for (int t = 0; t < 4; ++t) {
    std::thread([work] {
      for (;; ++rounds) {
        try {
          work->Run();
        } catch (const InvalidStateException &) {
          // The process is ending.
        }
      }
    }).detach();
  }
  Testing::Eventually([] { return rounds > 20; });
  std::exit(0);
}

TEST(OpenSslGuardDeathTest, LetsTheProcessEndWhileSignaturesAreMadeAndChecked) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  for (int i = 0; i < 5; ++i) {
    ASSERT_EXIT(EndWhileBusy(), testing::ExitedWithCode(0), "") << i;
  }
}

void ReportRefusal(const char *name, const std::function<void()> &use) {
  try {
    use();
    std::cerr << name << " was not refused\n";
  } catch (const InvalidStateException &refusal) {
    std::cerr << name << ": " << refusal.what() << "\n";
  }
}

void UseAfterCleanUp() {
  UseSystemConfiguration();
  auto work = std::make_unique<const TokenWork>();
  work->Run();
  OPENSSL_cleanup();
  ReportRefusal("read", [&] { work->ReadCertificate(); });
  ReportRefusal("digest", [] { const Digest digest(DigestAlgorithm::SHA256); });
  ReportRefusal("subject", [&] { static_cast<void>(work->GetCertificate().GetSubject()); });
  ReportRefusal("write", [&] { static_cast<void>(work->GetCertificate().ToPem()); });
  ReportRefusal("sign", [&] { work->Run(); });
  ReportRefusal("verify", [&] { work->Verify(work->GetCertificate(), std::vector<std::uint8_t>(256)); });
  ReportRefusal("PEM", [] { CreatePrivateKey(Testing::ReadFixture("rsa2048.key")); });
  ReportRefusal("DER", [] { CreatePrivateKey(Testing::ReadFixture("rsa2048.key.der")); });
  ReportRefusal("PKCS#12", [] { CreateKeyStoreFromPkcs12(Testing::ReadFixture("p256.p12"), {}); });
  ReportRefusal("URI", [] { LoadPrivateKey("file:nowhere"); });
  ReportRefusal("match", [&] { work->RequireMatch(); });
  ReportRefusal("system configuration", [] { UseSystemConfiguration(); });
  work.reset(); // nothing is freed
  std::_Exit(0);
}

TEST(Passphrase, SuspendsTheGuardWhileItAsksTheHost) {
  OpenSslGuard::Prepare();
  OpenSslGuard guard;
  const PassphraseCallback ask = [&guard] {
    EXPECT_FALSE(guard); // so that a clean-up does not wait for the user
    return std::string("x");
  };
  Passphrase passphrase(ask, guard, nullptr);
  EXPECT_EQ(passphrase.Get(), "x");
  EXPECT_TRUE(guard);
}

TEST(Passphrase, ResumesTheGuardWhenTheHostThrows) {
  OpenSslGuard::Prepare();
  OpenSslGuard guard;
  const PassphraseCallback ask = []() -> std::string { throw InvalidArgumentException("no"); };
  Passphrase passphrase(ask, guard, nullptr);
  EXPECT_THROW(passphrase.Get(), InvalidArgumentException);
  EXPECT_TRUE(guard);
}

void CleanUpWhileThePassphraseIsAskedFor() {
  ReportRefusal("key", [] {
    CreatePrivateKey(Testing::ReadFixture("p256-encrypted.key"), [] {
      OPENSSL_cleanup(); // would wait for a use under way
      return Testing::PASSPHRASE;
    });
  });
  std::_Exit(0);
}

/// Leaves a thread idle that has used OpenSSL, and reports whether it ends before the clean-up, and after it.
void WaitForAnIdleThread() {
  static const Ref<System::ThreadPool> pool = System::CreateEndlessThreadPool(1, std::chrono::milliseconds(1));
  const auto work = std::make_shared<const TokenWork>();
  pool->QueueWorkItem([work] { work->Run(); });
  std::cerr << "before: " << Testing::Eventually([] { return pool->GetThreadCount() == 0; });
  std::promise<void> cleaned;
  pool->QueueWorkItem([&cleaned, &work] {
    work->Run();
    OPENSSL_cleanup();
    cleaned.set_value();
  });
  cleaned.get_future().wait();
  std::this_thread::sleep_for(std::chrono::milliseconds(100)); // a hundred times the idle time
  std::cerr << ", after: " << (pool->GetThreadCount() == 0) << "\n";
  std::_Exit(0);
}

TEST(OpenSslGuardDeathTest, KeepsIdleThreadsAfterTheCleanUp) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_EXIT(WaitForAnIdleThread(), testing::ExitedWithCode(0), "^before: 1, after: 0\n$");
}

TEST(OpenSslGuardDeathTest, RefusesUseAfterACleanUpDuringThePassphraseCallback) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_EXIT(CleanUpWhileThePassphraseIsAskedFor(), testing::ExitedWithCode(0),
              "^key: OpenSSL has cleaned itself up: the process is about to end\n$");
}

TEST(OpenSslGuardDeathTest, RefusesEveryUseAfterTheCleanUp) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const char *const reason = ": OpenSSL has cleaned itself up: the process is about to end\n";
  std::string expected = "^";
  for (const char *const name : {"read", "digest", "subject", "write", "sign", "verify", "PEM", "DER", "PKCS#12", "URI",
                                 "match", "system configuration"}) {
    expected.append(name).append(reason);
  }
  EXPECT_EXIT(UseAfterCleanUp(), testing::ExitedWithCode(0), expected + "$");
}

} // namespace
} // namespace Tarvel::Crypto
