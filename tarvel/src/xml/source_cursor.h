// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SourceCursor`, the position of a reader in the text of a document.

#pragma once

#include "xml/refusals.h"

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <string_view>

namespace Tarvel::Xml {

/// Classes of ASCII characters, as bits. The first three are from the grammar. A plain character is one that has no meaning
/// in its context and can be skipped.
enum CharacterClass : std::uint8_t {
  SPACE = 1,            // S, production 3
  NAME_START = 2,       // NameStartChar without the colon
  NAME = 4,             // NameChar without the colon
  PLAIN_IN_TEXT = 8,    // all but '<', '&', ']' and line ends
  PLAIN_IN_VALUE = 16,  // all but '<', '&', quotation marks and white space other than spaces
  PLAIN_IN_MARKUP = 32, // in comments, instructions and CDATA sections: all but '-', ']', '?' and line ends
};

constexpr std::array<std::uint8_t, 256> MakeCharacterClasses() noexcept {
  std::array<std::uint8_t, 256> classes{};
  const auto isOneOf = [](char character, std::string_view set) { return set.find(character) != set.npos; };
  for (unsigned code = 0; code < 0x80; ++code) {
    const char c = static_cast<char>(code);
    const bool isLetter = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
    const bool isInName = isLetter || (c >= '0' && c <= '9') || c == '-' || c == '.';
    const bool isAccepted = code >= 0x20 || isOneOf(c, "\t\r\n");
    classes[code] =
        static_cast<std::uint8_t>((isOneOf(c, " \t\r\n") ? SPACE : 0) | (isLetter ? NAME_START : 0) |
                                  (isInName ? NAME : 0) | (isAccepted && !isOneOf(c, "<&]\r\n") ? PLAIN_IN_TEXT : 0) |
                                  (isAccepted && !isOneOf(c, "<&\"'\t\r\n") ? PLAIN_IN_VALUE : 0) |
                                  (isAccepted && !isOneOf(c, "-]?\r\n") ? PLAIN_IN_MARKUP : 0));
  }
  return classes;
}

constexpr std::array<std::uint8_t, 256> CHARACTER_CLASSES = MakeCharacterClasses();

constexpr bool IsOfClass(char character, CharacterClass characterClass) noexcept {
  return (CHARACTER_CLASSES[static_cast<unsigned char>(character)] & characterClass) != 0;
}

// Most of a text is plain, so 16 bytes at a time are checked.
using Block = signed char __attribute__((vector_size(16)));

/// For each byte of `block`, whether it is possibly not plain. This includes all control characters and bytes beyond
/// ASCII.
template <CharacterClass PLAIN>
inline Block FindDoubtfulBytes(Block block) noexcept {
  auto found = block < ' '; // bytes are signed here
  if constexpr (PLAIN == PLAIN_IN_TEXT) {
    found |= (block == '<') | (block == '&') | (block == ']');
  } else if constexpr (PLAIN == PLAIN_IN_VALUE) {
    found |= (block == '<') | (block == '&') | (block == '"') | (block == '\'');
  } else {
    static_assert(PLAIN == PLAIN_IN_MARKUP);
    found |= (block == '-') | (block == ']') | (block == '?');
  }
  return found;
}

constexpr std::string_view INSTRUCTION_BEGIN = "<?";

/// A name as written, and where its prefix ends.
struct WrittenName {
  std::string_view text;
  std::size_t prefixLength = 0; // 0 without a prefix

  std::string_view GetPrefix() const noexcept { return text.substr(0, prefixLength); }
  std::string_view GetLocalName() const noexcept { return prefixLength ? text.substr(prefixLength + 1) : text; }
};

/// A position in a text. Nothing beyond the end of the text is read.
class SourceCursor {
public:
  /// @param source outlives the cursor.
  explicit SourceCursor(std::string_view source) noexcept
      : m_source(source), m_next(source.data()), m_end(source.data() + source.size()),
        m_lineBegin(source.data() + GetByteOrderMarkLength(source)) {}

  bool IsAtEnd() const noexcept { return m_next == m_end; }

  /// The next byte. Must not be called at the end.
  char Peek() const noexcept { return *m_next; }
  bool IsAt(char byte) const noexcept { return m_next != m_end && *m_next == byte; }
  bool IsAt(std::string_view literal) const noexcept {
    return static_cast<std::size_t>(m_end - m_next) >= literal.size() &&
           std::memcmp(m_next, literal.data(), literal.size()) == 0;
  }

  const char *GetPlace() const noexcept { return m_next; }
  std::size_t GetOffset(const char *place) const noexcept { return static_cast<std::size_t>(place - m_source.data()); }
  std::size_t GetRemaining() const noexcept { return static_cast<std::size_t>(m_end - m_next); }
  std::string_view GetSource() const noexcept { return m_source; }

  /// Whether `text` is a view of the source.
  bool IsInSource(std::string_view text) const noexcept {
    const std::less_equal<const char *> isNotAfter;
    return isNotAfter(m_source.data(), text.data()) && isNotAfter(text.data() + text.size(), m_end);
  }

  /// Line and column of what comes next.
  SourcePosition GetPosition() const noexcept {
    return {m_line, static_cast<std::uint32_t>(1 + (m_next - m_lineBegin))};
  }

  /// The text from `begin` to here.
  std::string_view GetFrom(const char *begin) const noexcept {
    return std::string_view(begin, static_cast<std::size_t>(m_next - begin));
  }

  /// Skips that many bytes, none of which is a line feed.
  void Advance(std::size_t bytes) noexcept { m_next += bytes; }

  /// Skips a line feed if one comes next.
  void SkipLineFeed() noexcept {
    if (IsAt('\n')) {
      BeginLine(++m_next);
    }
  }

  /// Skips `literal`, which has no line feed, if it comes next. @return whether it does.
  bool Skip(std::string_view literal) noexcept {
    const bool isHere = IsAt(literal);
    m_next += isHere ? literal.size() : 0;
    return isHere;
  }

  /// Skips `literal` with `last` after it if both come next. @return whether they do.
  bool Skip(std::string_view literal, char last) noexcept {
    const bool isHere = GetRemaining() > literal.size() && m_next[literal.size()] == last && IsAt(literal);
    m_next += isHere ? literal.size() + 1 : 0;
    return isHere;
  }

  /// Skips the plain characters that come next, many at a time. Outside attribute values, it also skips line feeds.
  template <CharacterClass PLAIN>
  void SkipPlain() noexcept {
    const char *next = m_next;
    for (;;) {
      next = SkipPlainBlocks<PLAIN>(next);
      if (next == m_end) {
        break;
      }
      if (PLAIN != PLAIN_IN_VALUE && *next == '\n') {
        BeginLine(++next);
      } else if (IsOfClass(*next, PLAIN)) {
        ++next;
      } else {
        break;
      }
    }
    m_next = next;
  }

  /// Skips the white space that comes next. @return whether there was any.
  bool SkipSpace() noexcept {
    const char *const begin = m_next;
    while (m_next != m_end && IsOfClass(*m_next, SPACE)) {
      if (*m_next++ == '\n') {
        BeginLine(m_next);
      }
    }
    return m_next != begin;
  }

  /// Skips one character, which need not be ASCII. Must not be called at the end.
  /// @throws XMLParseException when it is not UTF-8, does not exist in the declared encoding, or is not allowed in XML.
  void SkipCharacter() {
    const unsigned char byte = static_cast<unsigned char>(*m_next);
    if (byte >= 0x20 && byte < 0x80) {
      ++m_next;
    } else {
      SkipUncommonCharacter();
    }
  }

  /// From here on only ASCII is accepted, because the document declares it.
  void RequireAscii() noexcept { m_isAscii = true; }

  /// Skips a name without a colon. @return whether one comes next.
  bool SkipNcName() {
    if (IsAtEnd() || !IsOfClass(*m_next, NAME_START)) {
      return SkipNameBeyondAscii();
    }
    SkipNameCharacters();
    return IsAtEnd() || static_cast<unsigned char>(*m_next) < 0x80 || SkipRestOfName();
  }

  /// Skips a name with at most one colon, which is between two names. @return an empty name when none comes next.
  /// @param atEnd the refusal if the document ends after the colon.
  /// @throws XMLParseException when it has other colons or is too long.
  WrittenName ReadName(Refusal atEnd);

  /// Skips `INSTRUCTION_BEGIN`, which comes next, and the target of the processing instruction. @return the target.
  /// @throws XMLParseException when it is missing, too long, has a colon or is "xml" in any letter case.
  std::string_view ReadTarget();

  /// Refuses what comes next, for the reason `refusal`, or `atEnd` if the text ends here.
  [[noreturn]] void RefuseNext(Refusal refusal, Refusal atEnd, std::string_view found = {});
  [[noreturn]] void Refuse(Refusal refusal, const char *place, std::string_view found = {},
                           std::string_view alsoFound = {}) const;

private:
  /// The first byte from `next` on that is possibly not plain; on a big-endian machine, possibly a byte up to seven
  /// before it. If no block has such a byte, the beginning of the last bytes, which do not fill a block.
  template <CharacterClass PLAIN>
  const char *SkipPlainBlocks(const char *next) const noexcept {
    constexpr bool IS_FIRST_BYTE_LOWEST = std::endian::native == std::endian::little;
    for (; m_end - next >= static_cast<std::ptrdiff_t>(sizeof(Block)); next += sizeof(Block)) {
      Block block;
      std::memcpy(&block, next, sizeof block);
      const Block found = FindDoubtfulBytes<PLAIN>(block);
      std::uint64_t halves[2];
      std::memcpy(halves, &found, sizeof halves);
      if (halves[0]) {
        return next + (IS_FIRST_BYTE_LOWEST ? std::countr_zero(halves[0]) / 8 : 0);
      }
      if (halves[1]) {
        return next + 8 + (IS_FIRST_BYTE_LOWEST ? std::countr_zero(halves[1]) / 8 : 0);
      }
    }
    return next;
  }

  void BeginLine(const char *place) noexcept {
    ++m_line;
    m_lineBegin = place;
  }

  /// Skips the characters of a name that are ASCII.
  void SkipNameCharacters() noexcept {
    const char *next = m_next;
    while (m_end - next >= 4 && IsOfClass(next[0], NAME) && IsOfClass(next[1], NAME) && IsOfClass(next[2], NAME) &&
           IsOfClass(next[3], NAME)) {
      next += 4;
    }
    while (next != m_end && IsOfClass(*next, NAME)) {
      ++next;
    }
    m_next = next;
  }

  void SkipUncommonCharacter();
  bool SkipNameBeyondAscii();
  bool SkipRestOfName();
  bool SkipNonAsciiNameCharacter(bool (*isAccepted)(std::uint32_t));

  std::string_view m_source;
  const char *m_next;
  const char *m_end;
  const char *m_lineBegin;
  std::uint32_t m_line = 1;
  bool m_isAscii = false;
};

} // namespace Tarvel::Xml
