// SPDX-License-Identifier: Apache-2.0

#include "xml/security/canonical_output.h"

#include "xml/escapes.h"

#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <string>

namespace Tarvel::Xml::Security {

namespace {

// Escaping makes a document longer, and exclusive canonicalisation repeats a namespace declaration on each element that
// needs it. A form longer than this limit is a denial-of-service attempt.
constexpr std::size_t MAX_CANONICAL_BYTES = 8 * MAX_DOCUMENT_BYTES;

template <EscapeSet SET>
void PutEscaped(CanonicalOutput &output, std::string_view text) {
  const char *from = text.data();
  const char *const end = from + text.size();
  for (;;) {
    const char *const escaped = FindEscaped<SET>(from, end);
    output.Put(std::string_view(from, static_cast<std::size_t>(escaped - from)));
    if (escaped == end) {
      return;
    }
    output.Put(EscapeOf(*escaped));
    from = escaped + 1;
  }
}

} // namespace

void CanonicalOutput::PutText(std::string_view text) {
  PutEscaped<ESCAPED_IN_TEXT>(*this, text);
}

void CanonicalOutput::PutAttributeValue(std::string_view value) {
  PutEscaped<ESCAPED_IN_ATTRIBUTE>(*this, value);
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
