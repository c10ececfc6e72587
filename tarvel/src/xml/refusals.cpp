// SPDX-License-Identifier: Apache-2.0

#include "xml/refusals.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/parser.h>

#include <algorithm>
#include <string>

namespace Tarvel::Xml {

namespace {

constexpr std::size_t NPOS = std::string_view::npos;
constexpr std::string_view UTF8_MARK = "\xEF\xBB\xBF";

/// Replaces `marker` by what was found, with '?' in place of control characters: a namespace name may contain line
/// ends, written as references, but the text must stay on one line.
void FillIn(std::string &text, std::string_view marker, std::string_view found) {
  const std::size_t place = text.find(marker);
  if (place != NPOS) {
    std::string shown = StringUtil::Shorten(found);
    std::replace_if(
        shown.begin(), shown.end(), [](char c) { return static_cast<unsigned char>(c) < ' ' || c == '\x7F'; }, '?');
    text.replace(place, marker.size(), shown);
  }
}

} // namespace

SourcePosition GetPosition(std::string_view source, std::size_t offset) noexcept {
  const std::string_view before = source.substr(0, offset);
  const std::size_t lastBreak = before.rfind('\n');
  const std::size_t lineBegin = lastBreak == NPOS ? std::min(GetByteOrderMarkLength(source), offset) : lastBreak + 1;
  return {static_cast<std::uint32_t>(1 + std::count(before.begin(), before.end(), '\n')),
          static_cast<std::uint32_t>(1 + offset - lineBegin)};
}

std::size_t GetByteOrderMarkLength(std::string_view source) noexcept {
  return source.substr(0, UTF8_MARK.size()) == UTF8_MARK ? UTF8_MARK.size() : 0;
}

void Refuse(Refusal refusal, std::string_view source, std::size_t offset, std::string_view found,
            std::string_view alsoFound) {
  std::string text(REFUSAL_TEXTS[static_cast<std::size_t>(refusal)]);
  FillIn(text, "%2", alsoFound); // first, because `found` may contain "%2"
  FillIn(text, "%1", found);
  const SourcePosition position = GetPosition(source, offset);
  throw XMLParseException(text, position.line, position.column);
}

} // namespace Tarvel::Xml
