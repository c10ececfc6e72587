// SPDX-License-Identifier: Apache-2.0
/// @file
/// Base64: an accepted text, without its white space, is what our encoder and OpenSSL's write for the decoded bytes. A
/// text in whole groups without white space that OpenSSL's block decoder accepts is accepted here too, unless its
/// padding is not canonical.

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <openssl/evp.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

namespace {

using Bytes = std::vector<std::uint8_t>;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

std::string EncodedByOpenSsl(const std::uint8_t *data, std::size_t length) {
  std::string text((length + 2) / 3 * 4 + 1, '\0');
  auto *const out = reinterpret_cast<unsigned char *>(text.data());
  text.resize(static_cast<std::size_t>(EVP_EncodeBlock(out, data, static_cast<int>(length))));
  return text;
}

std::string WithoutWhiteSpace(std::string_view text) {
  std::string rest(text);
  const auto isBlank = [](char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; };
  rest.erase(std::remove_if(rest.begin(), rest.end(), isBlank), rest.end());
  return rest;
}

/// Whether OpenSSL decodes `text` and encodes the result as the same text.
bool IsCanonicalToOpenSsl(const std::string &text) {
  Bytes bytes(text.size() + 4);
  const int decoded = EVP_DecodeBlock(bytes.data(), reinterpret_cast<const unsigned char *>(text.data()),
                                      static_cast<int>(text.size()));
  if (decoded < 0) {
    return false;
  }
  // EVP_DecodeBlock's length includes the bytes of the padding.
  const auto pads = std::min<std::ptrdiff_t>(std::count(text.begin(), text.end(), '='), decoded);
  return EncodedByOpenSsl(bytes.data(), static_cast<std::size_t>(decoded - pads)) == text;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string encoded = Tarvel::StringUtil::Base64Encode(data, size);
  Require(encoded == EncodedByOpenSsl(data, size));
  Require(Tarvel::StringUtil::Base64Decode(encoded) == Bytes(data, data + size));

  const std::string_view text(reinterpret_cast<const char *>(data), size);
  const std::string bare = WithoutWhiteSpace(text);
  try {
    const Bytes decoded = Tarvel::StringUtil::Base64Decode(text);
    Require(EncodedByOpenSsl(decoded.data(), decoded.size()) == bare);
  } catch (const Tarvel::Base64FormatException &error) {
    Require(*error.what() != '\0');
    Require(!IsCanonicalToOpenSsl(bare));
  }
  return 0;
}
