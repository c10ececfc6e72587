// SPDX-License-Identifier: Apache-2.0
/// @file
/// Structured fields of HTTP (RFC 8941): the header fields that are dictionaries.
///
/// The reader is stricter than RFC 8941, because what it reads decides what is accepted: a key that appears twice,
/// Base64 that is not canonical, and more than the limits below are refused. The types that only RFC 9651 has (dates,
/// display strings) are not read.

#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace SsoClient {

/// The limits of a dictionary. The length of a field is limited by the length of the header.
constexpr std::size_t MAX_DICTIONARY_MEMBERS = 32;
constexpr std::size_t MAX_INNER_LIST_ITEMS = 128;
constexpr std::size_t MAX_PARAMETERS = 32; ///< of one item or inner list

/// A decimal (RFC 8941, section 3.3.2).
struct StructuredDecimal {
  std::int64_t thousandths;
};

/// A token (RFC 8941, section 3.3.4).
struct StructuredToken {
  std::string text;
};

/// A bare item (RFC 8941, section 3.3): an integer, a decimal, a string, a token, octets or a Boolean.
using StructuredBareItem =
    std::variant<std::int64_t, StructuredDecimal, std::string, StructuredToken, std::vector<std::uint8_t>, bool>;

/// A parameter of an item or an inner list.
struct StructuredParameter {
  std::string key;
  StructuredBareItem value;
};

/// An item with its parameters.
struct StructuredItem {
  StructuredBareItem value;
  std::vector<StructuredParameter> parameters;
};

/// An inner list (RFC 8941, section 3.1.1) with its parameters.
struct StructuredInnerList {
  std::vector<StructuredItem> items;
  std::vector<StructuredParameter> parameters;
};

/// A member of a dictionary (RFC 8941, section 3.2).
struct StructuredMember {
  std::string key;
  std::variant<StructuredItem, StructuredInnerList> value;
};

/// Reads the dictionary `text`, in linear time.
/// @param field the field's name, for the message
/// @throws InvalidMessageException when it is malformed, or exceeds a limit.
std::vector<StructuredMember> ReadDictionary(std::string_view field, std::string_view text);

/// The value of the parameter `key`; null if there is none.
const StructuredBareItem *FindParameter(const std::vector<StructuredParameter> &parameters,
                                        std::string_view key) noexcept;

/// Whether `text` may be a key of a dictionary.
bool IsStructuredKey(std::string_view text) noexcept;

/// Whether `text` may be a string: printable ASCII.
bool IsStructuredString(std::string_view text) noexcept;

/// The only serialisation of a value (RFC 8941, section 4.1).
std::string WriteStructured(const StructuredInnerList &list);
std::string WriteStructured(const StructuredBareItem &item);

} // namespace SsoClient
