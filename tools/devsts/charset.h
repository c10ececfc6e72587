// SPDX-License-Identifier: Apache-2.0
/// @file
/// The encoding that messages have on the wire.

#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace DevSts {

/// Inside the service every text is UTF-8. Any number of threads may use it at once.
class Charset {
public:
  /// @param name one that libxml2 can encode and decode, in any letter case; the answers name it so
  explicit Charset(std::string name) : m_name(std::move(name)) {}

  /// A received message as UTF-8; nothing when it is not in this charset. An XML declaration in it is left as it is.
  std::optional<std::string> Decode(std::string_view message) const;

  /// An answer as it is sent. What the charset does not have is written as a character reference. In any charset but
  /// UTF-8, an XML declaration comes first.
  std::string Encode(const std::string &answer) const;

  /// The answers' media type.
  std::string ContentType() const;

private:
  bool IsUtf8() const;

  const std::string m_name;
};

} // namespace DevSts
