// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

namespace Tarvel {

namespace {

constexpr std::size_t MAX_CONTINUATION_BYTES = 3; // of one UTF-8 character

bool IsContinuation(char byte) noexcept {
  return (static_cast<unsigned char>(byte) & 0xC0) == 0x80;
}

} // namespace

std::string StringUtil::Shorten(std::string_view text, std::size_t most) {
  if (text.size() <= most) {
    return std::string(text);
  }
  std::size_t end = most;
  while (end > 0 && most - end < MAX_CONTINUATION_BYTES && IsContinuation(text[end])) {
    --end;
  }
  return std::string(text.substr(0, end)) + "... (" + std::to_string(text.size() - end) + " more bytes)";
}

} // namespace Tarvel
