// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

#include <array>
#include <cstdio>

namespace Tarvel {

namespace {

bool CanSteerTerminal(unsigned codePoint) {
  return codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F) || codePoint == 0x61C ||
         (codePoint >= 0x200E && codePoint <= 0x200F) || (codePoint >= 0x2028 && codePoint <= 0x202E) ||
         (codePoint >= 0x2066 && codePoint <= 0x2069);
}

struct Decoded {
  unsigned codePoint;
  std::size_t length;
};

/// The length of the UTF-8 sequence that begins with `lead`; 1 for an octet that cannot begin one.
std::size_t AnnouncedLength(unsigned char lead) {
  if (lead < 0xC2 || lead > 0xF4) {
    return 1;
  }
  return lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
}

/// The first code point of `text`. An octet that does not begin a complete sequence, for example in a name that is not
/// UTF-8, counts as one code point, so that a control character after it is found.
Decoded DecodeFirst(std::string_view text) {
  const auto octet = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
  const std::size_t length = AnnouncedLength(octet(0));
  if (length == 1 || length > text.size()) {
    return {octet(0), 1};
  }
  unsigned codePoint = octet(0) & (0x7Fu >> length);
  for (std::size_t i = 1; i < length; ++i) {
    if ((octet(i) & 0xC0u) != 0x80u) {
      return {octet(0), 1};
    }
    codePoint = (codePoint << 6) | (octet(i) & 0x3Fu);
  }
  return {codePoint, length};
}

} // namespace

std::string StringUtil::Printable(std::string_view text) {
  std::string out;
  while (!text.empty()) {
    const Decoded decoded = DecodeFirst(text);
    if (CanSteerTerminal(decoded.codePoint)) {
      std::array<char, 12> escaped{}; // enough for any 32 bits
      std::snprintf(escaped.data(), escaped.size(), "\\u%04X", decoded.codePoint);
      out += escaped.data();
    } else {
      out += text.substr(0, decoded.length);
    }
    text.remove_prefix(decoded.length);
  }
  return out;
}

} // namespace Tarvel
