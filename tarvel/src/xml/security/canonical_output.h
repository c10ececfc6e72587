// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CanonicalOutput`, which buffers canonical octets and escapes characters.

#pragma once

#include <tarvel/io/writer.h>

#include <array>
#include <cstddef>
#include <string_view>

namespace Tarvel::Xml::Security {

/// A buffer in front of a `Writer`. One thread at a time may use it.
class CanonicalOutput {
public:
  explicit CanonicalOutput(Writer &writer) noexcept : m_writer(writer) {}
  CanonicalOutput(const CanonicalOutput &) = delete;
  CanonicalOutput &operator=(const CanonicalOutput &) = delete;

  /// Writes the pieces, which are texts, one after another.
  /// @throws XmlSecurityException when the total number of octets exceeds the limit.
  template <typename... Pieces>
  void Put(const Pieces &...pieces) {
    if ((std::string_view(pieces).size() + ...) > m_buffer.size() - m_used) {
      (PutPiece(pieces), ...);
    } else {
      (PutIntoBuffer(pieces), ...);
    }
  }

  /// Character data: ampersand, angle brackets and carriage return escaped.
  void PutText(std::string_view text);

  /// The inside of an attribute value: ampersand, "less than", quotation mark, tab, line feed and carriage return escaped.
  void PutAttributeValue(std::string_view value);

  /// Writes the content of the buffer to the writer. Call this at the end.
  void Flush();

private:
  static constexpr std::size_t BUFFER_BYTES = 4096;

  void PutPiece(std::string_view octets) {
    if (octets.size() > m_buffer.size() - m_used) {
      PutPastBuffer(octets);
    } else {
      PutIntoBuffer(octets);
    }
  }
  void PutIntoBuffer(std::string_view octets) noexcept {
    octets.copy(m_buffer.data() + m_used, octets.size());
    m_used += octets.size();
  }
  void PutPastBuffer(std::string_view octets);
  void Count(std::size_t octets);

  Writer &m_writer;
  std::array<char, BUFFER_BYTES> m_buffer;
  std::size_t m_used = 0;
  std::size_t m_total = 0;
};

} // namespace Tarvel::Xml::Security
