// SPDX-License-Identifier: Apache-2.0
/// @file
/// What is refused about the bytes of a document before a parser sees them.

#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace Tarvel {
namespace Xml {

/// Line and column from 1; the column in bytes.
struct SourcePosition {
  std::uint32_t line;
  std::uint32_t column;
};

/// Where in `source` the byte at `offset` stands. A byte order mark takes no column.
SourcePosition GetPosition(std::string_view source, std::size_t offset) noexcept;

/// Length of the UTF-8 byte order mark that `source` begins with, or 0.
std::size_t GetByteOrderMarkLength(std::string_view source) noexcept;

/// Checks length, encoding (as it is and as it is declared), XML version and the number of attributes of each start tag, in
/// time linear in the length.
/// @throws XMLParseException for the first of these, in this order, that is not as it must be.
void CheckSource(std::string_view source);

} // namespace Xml
} // namespace Tarvel
