// SPDX-License-Identifier: Apache-2.0

#include "http/chunked_body.h"

#include "core/wiped_growth.h"
#include "http/header_syntax.h"

#include <tarvel/http/user_agent.h>

#include <algorithm>

namespace Tarvel::Http {

namespace {

constexpr const char *NO_LINE_FEED = "a carriage return without a line feed";

[[noreturn]] void Refuse(const char *what) {
  throw HttpException(std::string("the chunked body is broken: ") + what);
}

/// -1 when `c` is not a digit.
int HexDigitValue(char c) noexcept {
  if (c >= '0' && c <= '9') {
    return c - '0';
  }
  const char lower = static_cast<char>(c | 0x20);
  return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

void Require(char c, char expected, const char *what) {
  if (c != expected) {
    Refuse(what);
  }
}

/// Refuses a control character in a line that is skipped: an intermediary could treat a line feed without a carriage
/// return as the end of the line.
void RequireText(char c) {
  if (IsControlCharacter(c) && c != '\t') {
    Refuse("a control character in an extension or the trailer");
  }
}

} // namespace

std::size_t ChunkedBodyDecoder::Put(std::string_view bytes, std::string &body) {
  std::size_t taken = 0;
  while (taken < bytes.size() && !IsComplete()) {
    if (m_expected != Expected::DATA) {
      TakeCharacter(bytes[taken++], body.size());
      continue;
    }
    const std::string_view data = bytes.substr(taken, m_size);
    AppendWiping(body, data);
    taken += data.size();
    m_size -= data.size();
    if (m_size == 0) {
      m_expected = Expected::DATA_RETURN;
    }
  }
  return taken;
}

void ChunkedBodyDecoder::TakeCharacter(char c, std::size_t bodyLength) {
  switch (m_expected) {
  case Expected::SIZE:
  case Expected::MORE_OF_SIZE:
  case Expected::EXTENSION:
  case Expected::SIZE_LINE_FEED:
    TakeCharacterOfSizeLine(c, bodyLength);
    return;
  case Expected::DATA_RETURN:
    Require(c, '\r', "a chunk longer than its size");
    m_expected = Expected::DATA_LINE_FEED;
    return;
  case Expected::DATA_LINE_FEED:
    Require(c, '\n', NO_LINE_FEED);
    m_expected = Expected::SIZE;
    return;
  case Expected::TRAILER_LINE:
  case Expected::MORE_OF_TRAILER_LINE:
  case Expected::TRAILER_LINE_FEED:
  case Expected::LAST_LINE_FEED:
    TakeCharacterOfTrailer(c);
    return;
  case Expected::DATA:
  case Expected::NOTHING:
    return; // not called in these states: `Put` handles data itself, and reads nothing after the end
  }
}

void ChunkedBodyDecoder::TakeCharacterOfSizeLine(char c, std::size_t bodyLength) {
  if (m_expected == Expected::SIZE_LINE_FEED) {
    Require(c, '\n', NO_LINE_FEED);
    m_expected = m_size == 0 ? Expected::TRAILER_LINE : Expected::DATA;
    return;
  }
  if (m_expected == Expected::SIZE) {
    if (HexDigitValue(c) < 0) {
      Refuse("a chunk without a size");
    }
    m_size = 0;
    TakeSizeDigit(c, bodyLength);
    m_expected = Expected::MORE_OF_SIZE;
    return;
  }
  if (c == '\r') {
    m_expected = Expected::SIZE_LINE_FEED;
    return;
  }
  if (m_expected == Expected::EXTENSION) {
    RequireText(c);
    CountOverhead();
    return;
  }
  if (c == ';' || c == ' ' || c == '\t') {
    m_expected = Expected::EXTENSION;
    return;
  }
  TakeSizeDigit(c, bodyLength);
}

void ChunkedBodyDecoder::TakeCharacterOfTrailer(char c) {
  if (m_expected == Expected::TRAILER_LINE_FEED || m_expected == Expected::LAST_LINE_FEED) {
    Require(c, '\n', NO_LINE_FEED);
    m_expected = m_expected == Expected::LAST_LINE_FEED ? Expected::NOTHING : Expected::TRAILER_LINE;
    return;
  }
  if (c == '\r') {
    m_expected = m_expected == Expected::TRAILER_LINE ? Expected::LAST_LINE_FEED : Expected::TRAILER_LINE_FEED;
    return;
  }
  RequireText(c);
  CountOverhead();
  m_expected = Expected::MORE_OF_TRAILER_LINE;
}

void ChunkedBodyDecoder::TakeSizeDigit(char c, std::size_t bodyLength) {
  const int digit = HexDigitValue(c);
  if (digit < 0) {
    Refuse("a size that is not a hexadecimal number");
  }
  m_size = m_size * 16 + static_cast<std::size_t>(digit);
  // The check at each digit also keeps the number from overflowing.
  if (m_size > MAX_BODY_BYTES - bodyLength) {
    throw HttpException("the body is longer than " + std::to_string(MAX_BODY_BYTES) + " bytes");
  }
  if (m_size == 0) {
    CountOverhead();
  }
}

void ChunkedBodyDecoder::CountOverhead() {
  if (++m_overhead > MAX_HEADER_BYTES) {
    throw HttpException("the extensions and the trailer of the chunked body are longer than " +
                        std::to_string(MAX_HEADER_BYTES) + " bytes");
  }
}

} // namespace Tarvel::Http
