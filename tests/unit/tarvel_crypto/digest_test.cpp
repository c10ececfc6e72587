// SPDX-License-Identifier: Apache-2.0

#include "crypto/digest.h"

#include <gtest/gtest.h>
#include <openssl/err.h>

#include <array>
#include <atomic>
#include <string>
#include <thread>
#include <vector>

namespace Tarvel::Crypto {

namespace {

std::string DigestInHex(DigestAlgorithm algorithm, std::initializer_list<std::string_view> pieces) {
  std::array<std::uint8_t, MAX_DIGEST_BYTES> value{};
  Digest digest(algorithm);
  for (const std::string_view piece : pieces) {
    digest.Update(piece);
  }
  digest.Finish(value.data());
  std::string hex;
  for (std::size_t i = 0; i < DigestBytes(algorithm); ++i) {
    hex.push_back("0123456789abcdef"[value[i] >> 4]);
    hex.push_back("0123456789abcdef"[value[i] & 15]);
  }
  return hex;
}

// The one-block examples of FIPS 180-4's example page.
TEST(Digest, AgreesWithTheExamplesOfTheStandard) {
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA256, {"abc"}),
            "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA384, {"abc"}),
            "cb00753f45a35e8bb5a03d699ac65007272c32ab0eded1631a8b605a43ff5bed8086072ba1e7cc2358baeca134c825a7");
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA512, {"abc"}),
            "ddaf35a193617abacc417349ae20413112e6fa4e89a97ea20a9eeee64b55d39a"
            "2192992a274fc1a836ba3c23a3feebbd454d4423643ce80e2a9ac94fa54ca49f");
}

TEST(Digest, AgreesWithTheStandardForTheEmptyMessage) {
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA256, {}),
            "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
}

TEST(Digest, DoesNotDependOnHowTheMessageIsSplit) {
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA256, {"a", "", "bc"}), DigestInHex(DigestAlgorithm::SHA256, {"abc"}));
}

constexpr const char *SHA256_OF_ABC = "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad";

TEST(Digest, DoesNotDependOnAnEarlierFinishedDigest) {
  DigestInHex(DigestAlgorithm::SHA256, {std::string(200, 'x')});
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA256, {"abc"}), SHA256_OF_ABC);
}

TEST(Digest, DoesNotDependOnAnEarlierAbandonedDigest) {
  {
    Digest digest(DigestAlgorithm::SHA256);
    digest.Update("x");
  }
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA256, {"abc"}), SHA256_OF_ABC);
}

TEST(Digest, DoesNotDependOnAnotherDigestUnderWay) {
  Digest outer(DigestAlgorithm::SHA256);
  outer.Update("a");
  EXPECT_EQ(DigestInHex(DigestAlgorithm::SHA256, {"abc"}), SHA256_OF_ABC);
  outer.Update("bc");
  std::array<std::uint8_t, MAX_DIGEST_BYTES> value{};
  outer.Finish(value.data());
  EXPECT_EQ(value[0], 0xba);
  EXPECT_EQ(value[31], 0xad);
}

TEST(Digest, IsCorrectOnManyThreads) {
  std::atomic<int> wrong{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&wrong] {
      for (int round = 0; round < 200; ++round) {
        wrong += DigestInHex(DigestAlgorithm::SHA256, {"a", "bc"}) == SHA256_OF_ABC ? 0 : 1;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, 0);
}

TEST(Digest, KeepsTheErrorsOfTheHost) {
  ERR_clear_error();
  ERR_raise(ERR_LIB_USER, 7);
  DigestInHex(DigestAlgorithm::SHA256, {"abc"});
  EXPECT_EQ(ERR_GET_REASON(ERR_get_error()), 7);
  EXPECT_EQ(ERR_get_error(), 0U);
}

} // namespace

} // namespace Tarvel::Crypto
