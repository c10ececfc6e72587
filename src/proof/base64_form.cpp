// SPDX-License-Identifier: Apache-2.0

#include "proof/base64_form.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Encoding = TokenHeader::Encoding;

constexpr std::size_t GROUP = 4; // characters for three octets

void Exchange(std::string &text, char from, char to) {
  std::replace(text.begin(), text.end(), from, to);
}

} // namespace

std::string EncodeBase64(std::string_view octets, Encoding encoding) {
  std::string text(Tarvel::Base64_EncodedLength(octets.size()), '\0');
  Tarvel::Base64_Encode(reinterpret_cast<const std::uint8_t *>(octets.data()), octets.size(), text.data());
  if (encoding == Encoding::BASE64URL) {
    Exchange(text, '+', '-');
    Exchange(text, '/', '_');
    text.erase(std::find(text.begin(), text.end(), '='), text.end());
  }
  return text;
}

std::optional<std::vector<std::uint8_t>> DecodeBase64(std::string_view text, Encoding encoding) {
  const bool isForUrls = encoding == Encoding::BASE64URL;
  if (text.find_first_of(isForUrls ? "+/= \t\r\n" : " \t\r\n") != std::string_view::npos) {
    return std::nullopt;
  }
  std::string standard(text);
  if (isForUrls) {
    Exchange(standard, '-', '+');
    Exchange(standard, '_', '/');
    standard.append((GROUP - standard.size() % GROUP) % GROUP, '=');
  }
  try {
    return Tarvel::StringUtil::Base64Decode(standard);
  } catch (const Tarvel::Base64FormatException &) {
    return std::nullopt;
  }
}

} // namespace SsoClient
