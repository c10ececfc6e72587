// SPDX-License-Identifier: Apache-2.0
/// @file
/// The character encoding of messages on the wire.

#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace DevSts {

/// Converts between the encoding on the wire and UTF-8, which every text inside the service has. Any number of threads
/// may use it at once.
class Charset {
public:
  /// @param name one that libxml2 can encode and decode, in any letter case; the answers repeat it in that letter case
  explicit Charset(std::string name) : m_name(std::move(name)) {}

  /// A received message as UTF-8; none when it is not in this charset. An XML declaration in it is not changed.
  std::optional<std::string> Decode(std::string_view message) const;

  /// An answer in this charset. A character that the charset does not have becomes a character reference. In any
  /// charset but UTF-8, the answer begins with an XML declaration.
  std::string Encode(const std::string &answer) const;

  /// The `Content-Type` of answers with this media type.
  std::string ContentType(std::string_view mediaType) const;

private:
  bool IsUtf8() const;

  const std::string m_name;
};

} // namespace DevSts
