// SPDX-License-Identifier: Apache-2.0
/// @file
/// URI references by the grammar of RFC 3986.

#pragma once

#include <optional>
#include <string_view>

namespace Tarvel {

/// The parts of a URI reference: views of its text, in which nothing is unescaped. A missing part differs from an empty
/// one, except for the path, which is always present.
struct UriReference {
  std::optional<std::string_view> scheme;          ///< without the ":"
  std::optional<std::string_view> userInformation; ///< without the "@"
  std::optional<std::string_view>
      host; ///< set if there is an authority, even an empty one; an IP literal with its brackets
  std::optional<std::string_view> port; ///< digits, any number of them
  std::string_view path;
  std::optional<std::string_view> query;    ///< without the "?"
  std::optional<std::string_view> fragment; ///< without the "#"
};

/// Splits `text` into its parts, in linear time, without allocation. Checks everything except the content of an IP
/// literal's brackets, so that a caller that accepts fewer addresses can refuse them with its own message.
/// @return `std::nullopt` when `text` is not a URI reference.
std::optional<UriReference> SplitUriReference(std::string_view text) noexcept;

/// Whether `host` is an IP literal: an IPv6 address or a later form (`v1.x`), in brackets. RFC 3986 has no zones.
bool IsIpLiteral(std::string_view host) noexcept;

/// Whether `text` is a URI reference (RFC 3986, section 4.1): a URI or a relative reference, which may be empty. A
/// text with characters outside ASCII is not one.
bool IsUriReference(std::string_view text) noexcept;

} // namespace Tarvel
