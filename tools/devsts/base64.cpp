// SPDX-License-Identifier: Apache-2.0

#include "base64.h"

#include <openssl/evp.h>

#include <algorithm>
#include <iterator>

namespace DevSts {

std::vector<unsigned char> DecodeBase64(std::string_view text) {
  std::string packed;
  std::copy_if(text.begin(), text.end(), std::back_inserter(packed),
               [](char c) { return c != ' ' && c != '\t' && c != '\r' && c != '\n'; });
  std::vector<unsigned char> bytes(packed.size() / 4 * 3);
  if (packed.empty() || packed.size() % 4 != 0 || packed.size() > 65536 ||
      EVP_DecodeBlock(bytes.data(), reinterpret_cast<const unsigned char *>(packed.data()),
                      static_cast<int>(packed.size())) < 0) {
    return {};
  }
  // The decoder counts the padding as octets.
  const std::size_t padding = packed.size() - (packed.find_last_not_of('=') + 1);
  bytes.resize(bytes.size() - std::min<std::size_t>(padding, 2));
  return bytes;
}

std::string EncodeBase64(const std::vector<unsigned char> &bytes) {
  std::string text((bytes.size() + 2) / 3 * 4 + 1, '\0'); // the encoder ends with a zero
  const int length =
      EVP_EncodeBlock(reinterpret_cast<unsigned char *>(text.data()), bytes.data(), static_cast<int>(bytes.size()));
  text.resize(static_cast<std::size_t>(length));
  return text;
}

} // namespace DevSts
