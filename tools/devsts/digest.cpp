// SPDX-License-Identifier: Apache-2.0

#include "digest.h"

#include <openssl/evp.h>

#include <array>
#include <new>
#include <string_view>

namespace DevSts {

std::string Sha256Text(const std::vector<unsigned char> &octets) {
  std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
  unsigned length = 0;
  if (EVP_Digest(octets.data(), octets.size(), digest.data(), &length, EVP_sha256(), nullptr) != 1) {
    throw std::bad_alloc();
  }
  constexpr std::string_view DIGITS = "0123456789abcdef";
  std::string text;
  for (unsigned i = 0; i < length; ++i) {
    text += DIGITS[digest[i] >> 4u];
    text += DIGITS[digest[i] & 15u];
  }
  return text;
}

} // namespace DevSts
