// SPDX-License-Identifier: Apache-2.0

#include "xml/security/canonical_output.h"

#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <array>
#include <cstdint>
#include <cstring>

namespace Tarvel::Xml::Security {

namespace {

// Escaping makes a document longer, and exclusive canonicalisation repeats a namespace declaration on each element that
// needs it. What passes this bound is no message but an attempt to keep somebody busy.
constexpr std::size_t MAX_CANONICAL_BYTES = 8 * MAX_DOCUMENT_BYTES;

enum Place : std::uint8_t { IN_TEXT = 1, IN_ATTRIBUTE_VALUE = 2 };

constexpr std::array<std::uint8_t, 256> ESCAPED_IN = [] {
  std::array<std::uint8_t, 256> places{};
  places['&'] = IN_TEXT | IN_ATTRIBUTE_VALUE;
  places['<'] = IN_TEXT | IN_ATTRIBUTE_VALUE;
  places['>'] = IN_TEXT;
  places['"'] = IN_ATTRIBUTE_VALUE;
  places['\t'] = IN_ATTRIBUTE_VALUE;
  places['\n'] = IN_ATTRIBUTE_VALUE;
  places['\r'] = IN_TEXT | IN_ATTRIBUTE_VALUE;
  return places;
}();

std::string_view Escape(char character) {
  switch (character) {
  case '&':
    return "&amp;";
  case '<':
    return "&lt;";
  case '>':
    return "&gt;";
  case '"':
    return "&quot;";
  case '\t':
    return "&#x9;";
  case '\n':
    return "&#xA;";
  default:
    return "&#xD;";
  }
}

// Most of a message needs no escape, so that is found out for many octets at once.
using Block = unsigned char __attribute__((vector_size(16)));
constexpr std::size_t BLOCK_BYTES = sizeof(Block);

/// Whether one of the `BLOCK_BYTES` octets at `octets` is escaped at that place.
template <Place PLACE>
bool HasEscaped(const char *octets) {
  Block block;
  std::memcpy(&block, octets, BLOCK_BYTES);
  auto found = (block == '&') | (block == '<') | (block == '\r');
  if constexpr (PLACE == IN_TEXT) {
    found |= block == '>';
  } else {
    found |= (block == '"') | (block == '\t') | (block == '\n');
  }
  std::array<std::uint64_t, 2> halves;
  static_assert(sizeof(halves) == BLOCK_BYTES);
  std::memcpy(&halves, &found, BLOCK_BYTES);
  return (halves[0] | halves[1]) != 0;
}

/// The first octet from `from` to `end` that is escaped at that place, or `end`.
template <Place PLACE>
const char *FindEscaped(const char *from, const char *end) {
  const char *const begin = from;
  while (static_cast<std::size_t>(end - from) >= BLOCK_BYTES && !HasEscaped<PLACE>(from)) {
    from += BLOCK_BYTES;
  }
  // The octets that are left are the end of one more block, when there are that many octets before them.
  const bool isLastBlock = static_cast<std::size_t>(end - from) < BLOCK_BYTES;
  if (isLastBlock && static_cast<std::size_t>(end - begin) >= BLOCK_BYTES && !HasEscaped<PLACE>(end - BLOCK_BYTES)) {
    return end;
  }
  while (from != end && !(ESCAPED_IN[static_cast<unsigned char>(*from)] & PLACE)) {
    ++from;
  }
  return from;
}

template <Place PLACE>
void PutEscaped(CanonicalOutput &output, std::string_view text) {
  const char *from = text.data();
  const char *const end = from + text.size();
  for (;;) {
    const char *const escaped = FindEscaped<PLACE>(from, end);
    output.Put(std::string_view(from, static_cast<std::size_t>(escaped - from)));
    if (escaped == end) {
      return;
    }
    output.Put(Escape(*escaped));
    from = escaped + 1;
  }
}

} // namespace

void CanonicalOutput::PutText(std::string_view text) {
  PutEscaped<IN_TEXT>(*this, text);
}

void CanonicalOutput::PutAttributeValue(std::string_view value) {
  PutEscaped<IN_ATTRIBUTE_VALUE>(*this, value);
}

void CanonicalOutput::Flush() {
  if (m_used != 0) {
    Count(m_used);
    m_writer.Write(std::string_view(m_buffer.data(), m_used));
    m_used = 0;
  }
}

void CanonicalOutput::PutPastBuffer(std::string_view octets) {
  Flush();
  if (octets.size() < m_buffer.size()) {
    octets.copy(m_buffer.data(), octets.size());
    m_used = octets.size();
    return;
  }
  Count(octets.size());
  m_writer.Write(octets);
}

void CanonicalOutput::Count(std::size_t octets) {
  m_total += octets;
  if (m_total > MAX_CANONICAL_BYTES) {
    throw XmlSecurityException("The canonical form is longer than " + std::to_string(MAX_CANONICAL_BYTES) + " bytes");
  }
}

} // namespace Tarvel::Xml::Security
