// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/message_digest.h>

#include <gtest/gtest.h>

#include <string>

namespace Tarvel::Crypto {

namespace {

std::string DigestInHex(HashAlgorithm algorithm, std::string_view bytes) {
  std::string hex;
  for (const std::uint8_t octet : ComputeDigest(algorithm, bytes)) {
    hex.push_back("0123456789abcdef"[octet >> 4]);
    hex.push_back("0123456789abcdef"[octet & 15]);
  }
  return hex;
}

// The one-block examples of FIPS 180-4's example page.
TEST(ComputeDigest, AgreesWithTheExamplesOfTheStandard) {
  EXPECT_EQ(DigestInHex(HashAlgorithm::SHA256, "abc"),
            "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(DigestInHex(HashAlgorithm::SHA384, "abc"),
            "cb00753f45a35e8bb5a03d699ac65007272c32ab0eded1631a8b605a43ff5bed8086072ba1e7cc2358baeca134c825a7");
  EXPECT_EQ(DigestInHex(HashAlgorithm::SHA512, "abc"),
            "ddaf35a193617abacc417349ae20413112e6fa4e89a97ea20a9eeee64b55d39a"
            "2192992a274fc1a836ba3c23a3feebbd454d4423643ce80e2a9ac94fa54ca49f");
}

TEST(ComputeDigest, AgreesWithTheStandardForTheEmptyMessage) {
  EXPECT_EQ(DigestInHex(HashAlgorithm::SHA256, ""), "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
}

} // namespace

} // namespace Tarvel::Crypto
