// SPDX-License-Identifier: Apache-2.0

#include "crypto/recent_certificates.h"

#include "support/data_file.h"

#include <tarvel/crypto/certificate.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cstdint>
#include <string>
#include <thread>
#include <vector>

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Crypto::CreateCertificateFromDer;
using Tarvel::Crypto::FindRecentCertificate;
using Tarvel::Crypto::ForgetRecentCertificates;
using Octets = std::vector<std::uint8_t>;

Octets DerOf(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath(name)).front()->GetDer();
}

TEST(RecentCertificates, ContainACertificateThatWasDecoded) {
  const Octets der = DerOf("crypto/p256.crt");
  const Ref<const Certificate> first = CreateCertificateFromDer(der.data(), der.size());
  EXPECT_EQ(first, FindRecentCertificate(der.data(), der.size()));
  EXPECT_EQ(first, CreateCertificateFromDer(der.data(), der.size()));
}

TEST(RecentCertificates, DoNotContainOneThatDiffersInOneOctet) {
  const Octets der = DerOf("crypto/rsa2048.crt");
  const Ref<const Certificate> kept = CreateCertificateFromDer(der.data(), der.size());
  for (std::size_t at = 0; at < der.size(); ++at) {
    Octets changed = der;
    changed[at] ^= 1;
    EXPECT_FALSE(FindRecentCertificate(changed.data(), changed.size())) << at;
  }
  EXPECT_FALSE(FindRecentCertificate(der.data(), der.size() - 1));
  EXPECT_FALSE(FindRecentCertificate(der.data() + 1, der.size() - 1));
  EXPECT_FALSE(FindRecentCertificate(nullptr, 0));
}

TEST(RecentCertificates, AreForgotten) {
  const Octets der = DerOf("crypto/p256.crt");
  const Ref<const Certificate> first = CreateCertificateFromDer(der.data(), der.size());
  ForgetRecentCertificates();
  EXPECT_FALSE(FindRecentCertificate(der.data(), der.size()));
  EXPECT_EQ(first->GetDer(), der); // an object that is in use stays valid
  EXPECT_NE(first, CreateCertificateFromDer(der.data(), der.size()));
}

TEST(RecentCertificates, DoNotContainWhatDoesNotDecode) {
  const Octets noCertificate(700, 1);
  EXPECT_THROW(CreateCertificateFromDer(noCertificate.data(), noCertificate.size()), Tarvel::Crypto::CryptoException);
  EXPECT_FALSE(FindRecentCertificate(noCertificate.data(), noCertificate.size()));
}

TEST(RecentCertificates, AreSharedByManyThreads) {
  const std::vector<Octets> all = {DerOf("crypto/rsa2048.crt"), DerOf("crypto/p256.crt"), DerOf("crypto/p384.crt"),
                                   DerOf("tokens/holder.crt")};
  std::atomic<int> wrong{0};
  std::vector<std::thread> threads;
  for (int number = 0; number < 8; ++number) {
    threads.emplace_back([&] {
      for (int round = 0; round < 500; ++round) {
        const Octets &der = all[static_cast<std::size_t>(round) % all.size()];
        wrong += CreateCertificateFromDer(der.data(), der.size())->GetDer() == der ? 0 : 1;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(0, wrong);
}

} // namespace
