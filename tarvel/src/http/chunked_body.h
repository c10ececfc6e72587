// SPDX-License-Identifier: Apache-2.0
/// @file
/// Decoding of the chunked transfer coding.

#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace Tarvel::Http {

/// Decodes a body in the chunked coding (RFC 9112, section 7.1) piece by piece. Extensions and trailer are skipped.
class ChunkedBodyDecoder {
public:
  /// Decodes `bytes`, appends the result to `body`, and returns how many bytes were used: all, unless the body ends
  /// within them.
  /// @throws HttpException when `bytes` are not in the chunked coding, or make `body` longer than `MAX_BODY_BYTES`.
  std::size_t Put(std::string_view bytes, std::string &body);

  bool IsComplete() const noexcept { return m_expected == Expected::NOTHING; }

private:
  enum class Expected {
    SIZE, ///< its first digit
    MORE_OF_SIZE,
    EXTENSION,
    SIZE_LINE_FEED,
    DATA,
    DATA_RETURN,
    DATA_LINE_FEED,
    TRAILER_LINE, ///< its first character
    MORE_OF_TRAILER_LINE,
    TRAILER_LINE_FEED,
    LAST_LINE_FEED,
    NOTHING
  };

  void TakeCharacter(char c, std::size_t bodyLength);
  void TakeCharacterOfSizeLine(char c, std::size_t bodyLength);
  void TakeCharacterOfTrailer(char c);
  void TakeSizeDigit(char c, std::size_t bodyLength);
  void CountOverhead();

  Expected m_expected = Expected::SIZE;
  std::size_t m_size = 0;     // of the chunk, or of the rest of it
  std::size_t m_overhead = 0; // bytes of extensions, trailer and leading zeros so far
};

} // namespace Tarvel::Http
