// SPDX-License-Identifier: Apache-2.0

#include "xml/security/canonical_output.h"

#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <array>
#include <cstdint>

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

template <Place PLACE>
void PutEscaped(CanonicalOutput &output, std::string_view text) {
  const char *from = text.data();
  const char *const end = from + text.size();
  for (const char *at = from; at != end; ++at) {
    if (ESCAPED_IN[static_cast<unsigned char>(*at)] & PLACE) {
      output.Put(std::string_view(from, static_cast<std::size_t>(at - from)));
      output.Put(Escape(*at));
      from = at + 1;
    }
  }
  output.Put(std::string_view(from, static_cast<std::size_t>(end - from)));
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
