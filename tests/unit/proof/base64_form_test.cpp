// SPDX-License-Identifier: Apache-2.0

#include "proof/base64_form.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;

constexpr auto BASE64 = TokenHeader::Encoding::BASE64;
constexpr auto BASE64URL = TokenHeader::Encoding::BASE64URL;

// The octets of RFC 4648's example in section 9, and two for which the alphabets differ.
const std::string OCTETS = "\x14\xFB\x9C\x03\xD9\x7E\xFB\xFF";

std::string Decoded(const std::string &text, TokenHeader::Encoding encoding) {
  const auto octets = DecodeBase64(text, encoding);
  return octets ? std::string(octets->begin(), octets->end()) : "refused";
}

TEST(EncodeBase64, FollowsTheEncoding) {
  EXPECT_EQ(EncodeBase64(OCTETS, BASE64), "FPucA9l++/8=");
  EXPECT_EQ(EncodeBase64(OCTETS, BASE64URL), "FPucA9l--_8");
  EXPECT_EQ(EncodeBase64("", BASE64), "");
  EXPECT_EQ(EncodeBase64("", BASE64URL), "");
}

TEST(DecodeBase64, ReadsWhatEncodeBase64Writes) {
  for (std::size_t length = 0; length <= OCTETS.size(); ++length) {
    const std::string octets = OCTETS.substr(0, length);
    EXPECT_EQ(Decoded(EncodeBase64(octets, BASE64), BASE64), octets);
    EXPECT_EQ(Decoded(EncodeBase64(octets, BASE64URL), BASE64URL), octets);
  }
}

TEST(DecodeBase64, RefusesEveryOtherForm) {
  for (const char *const text :
       {"FPucA9l--_8", "FPucA9l++/8", "FPucA9l++/8==", "FPuc A9l++/8=", "FPucA9l++/9=", "F", "="}) {
    EXPECT_EQ(Decoded(text, BASE64), "refused") << text;
  }
  for (const char *const text : {"FPucA9l++/8", "FPucA9l--_8=", "FPuc\nA9l--_8", "FPucA9l--_9", "F", "=", "FPuc.A"}) {
    EXPECT_EQ(Decoded(text, BASE64URL), "refused") << text;
  }
}

} // namespace
