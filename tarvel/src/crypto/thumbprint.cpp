// SPDX-License-Identifier: Apache-2.0

#include "crypto/thumbprint.h"

#include "crypto/digest.h"

#include <array>
#include <string_view>

namespace Tarvel::Crypto {

std::string MakeSha256Thumbprint(const std::vector<std::uint8_t> &der) {
  constexpr std::string_view HEX_DIGITS = "0123456789abcdef";
  std::array<std::uint8_t, DigestBytes(DigestAlgorithm::SHA256)> digest{};
  Digest sha256(DigestAlgorithm::SHA256);
  sha256.Update(std::string_view(reinterpret_cast<const char *>(der.data()), der.size()));
  sha256.Finish(digest.data());
  std::string text;
  text.reserve(digest.size() * 2);
  for (const std::uint8_t byte : digest) {
    text.push_back(HEX_DIGITS[byte >> 4]);
    text.push_back(HEX_DIGITS[byte & 0x0f]);
  }
  return text;
}

} // namespace Tarvel::Crypto
