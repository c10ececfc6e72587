// SPDX-License-Identifier: Apache-2.0
// The hash is compared with OpenSSL's.
#include "guarded_clock.h"

#include "proof/remembered_messages.h"
#include "proof/sip_hash.h"

#include <gtest/gtest.h>
#include <openssl/evp.h>
#include <openssl/params.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <random>
#include <set>

namespace ReplayGuardTest {
namespace {

using SsoClient::MessageIdentifier;

std::uint64_t ReadNumber(const std::uint8_t *bytes) {
  std::uint64_t number = 0;
  for (int i = 7; i >= 0; --i) {
    number = number << 8 | bytes[i];
  }
  return number;
}

SsoClient::SipHash HashByOpenSsl(const std::array<std::uint8_t, 16> &key, const MessageIdentifier &identifier) {
  const std::unique_ptr<EVP_MAC, void (*)(EVP_MAC *)> method(EVP_MAC_fetch(nullptr, "SIPHASH", nullptr), &EVP_MAC_free);
  const std::unique_ptr<EVP_MAC_CTX, void (*)(EVP_MAC_CTX *)> context(EVP_MAC_CTX_new(method.get()), &EVP_MAC_CTX_free);
  std::size_t size = 16;
  const std::array<OSSL_PARAM, 2> parameters{OSSL_PARAM_construct_size_t("size", &size), OSSL_PARAM_construct_end()};
  std::array<std::uint8_t, 16> value{};
  std::size_t length = 0;
  EXPECT_EQ(EVP_MAC_init(context.get(), key.data(), key.size(), parameters.data()), 1);
  EXPECT_EQ(EVP_MAC_update(context.get(), identifier.data(), identifier.size()), 1);
  EXPECT_EQ(EVP_MAC_final(context.get(), value.data(), &length, value.size()), 1);
  EXPECT_EQ(length, value.size());
  return {ReadNumber(value.data()), ReadNumber(value.data() + 8)};
}

TEST(ComputeSipHash, IsTheHashThatOpenSslComputes) {
  std::mt19937_64 random(1);
  for (int i = 0; i < 1000; ++i) {
    std::array<std::uint8_t, 16> key{};
    MessageIdentifier identifier{};
    for (std::uint8_t &octet : key) {
      octet = static_cast<std::uint8_t>(random());
    }
    for (std::uint8_t &octet : identifier) {
      octet = static_cast<std::uint8_t>(random());
    }
    const SsoClient::SipHash expected = HashByOpenSsl(key, identifier);
    const SsoClient::SipHash hash =
        SsoClient::ComputeSipHash({ReadNumber(key.data()), ReadNumber(key.data() + 8)}, identifier);
    EXPECT_EQ(hash.first, expected.first);
    EXPECT_EQ(hash.second, expected.second);
  }
}

// A tag of 0 marks an empty place, so the table uses another one for this identifier: the upper half of its hash is 0.
TEST(RememberedMessages, FindsAnIdentifierWhoseHashBeginsWithZeros) {
  constexpr std::uint64_t NUMBER = 5'921'224'313;
  constexpr SsoClient::SipHashKey KEY{0, 0};
  const MessageIdentifier identifier = MakeIdentifier(NUMBER);
  ASSERT_EQ(SsoClient::ComputeSipHash(KEY, identifier).first >> 32, 0u);
  SsoClient::RememberedMessages messages(10, KEY);
  const auto place = messages.Prepare(identifier);
  EXPECT_EQ(messages.Remember(place, 2, 1), SsoClient::ReplayGuard::Answer::FIRST);
  EXPECT_EQ(messages.Remember(place, 2, 1), SsoClient::ReplayGuard::Answer::REPEATED);
}

// Among so many identifiers, several pairs have the same tag of 32 bits.
TEST(RememberedMessages, ComparesTheWholeHash) {
  constexpr std::uint64_t IDENTIFIERS = 300'000;
  SsoClient::RememberedMessages messages(IDENTIFIERS, {1, 2});
  std::set<std::uint32_t> tags;
  for (std::uint64_t i = 0; i < IDENTIFIERS; ++i) {
    const auto place = messages.Prepare(MakeIdentifier(i));
    tags.insert(place.tag);
    ASSERT_EQ(messages.Remember(place, 2, 1), SsoClient::ReplayGuard::Answer::FIRST) << i;
  }
  EXPECT_LT(tags.size(), IDENTIFIERS);
}

} // namespace
} // namespace ReplayGuardTest
