// SPDX-License-Identifier: Apache-2.0

#include "core/uri_reference.h"

#include <algorithm>
#include <arpa/inet.h>
#include <array>
#include <cstddef>
#include <cstdint>

namespace Tarvel {

namespace {

constexpr std::size_t NPOS = std::string_view::npos;

// The parts of a URI that a character may be in, one bit each. A "%" has none of these bits: it is valid where two
// hexadecimal digits follow.
constexpr std::uint8_t ALPHA = 1U << 0U;
constexpr std::uint8_t DIGIT = 1U << 1U;
constexpr std::uint8_t HEX = 1U << 2U;
constexpr std::uint8_t SCHEME = 1U << 3U;
constexpr std::uint8_t NAME = 1U << 4U;  // a registered name: unreserved and sub-delims
constexpr std::uint8_t USER = 1U << 5U;  // user information, and an address of a later version
constexpr std::uint8_t PATH = 1U << 6U;  // pchar and "/"
constexpr std::uint8_t QUERY = 1U << 7U; // query and fragment

using Classes = std::array<std::uint8_t, 256>;

constexpr void Add(Classes &classes, std::string_view characters, unsigned bits) {
  for (const char c : characters) {
    classes[static_cast<unsigned char>(c)] |= static_cast<std::uint8_t>(bits);
  }
}

constexpr Classes MakeClasses() {
  constexpr unsigned REST = NAME | USER | PATH | QUERY;
  Classes classes{};
  Add(classes, "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ", ALPHA | SCHEME | REST);
  Add(classes, "0123456789", DIGIT | HEX | SCHEME | REST);
  Add(classes, "abcdefABCDEF", HEX);
  Add(classes, "+-.", SCHEME);
  Add(classes, "-._~", REST);        // unreserved
  Add(classes, "!$&'()*+,;=", REST); // sub-delims
  Add(classes, ":", USER | PATH | QUERY);
  Add(classes, "@/", PATH | QUERY);
  Add(classes, "?", QUERY);
  return classes;
}

constexpr Classes CLASSES = MakeClasses();

bool Is(char c, std::uint8_t bit) noexcept {
  return (CLASSES[static_cast<unsigned char>(c)] & bit) != 0;
}

/// The number of characters at the start of `text` that are in the class.
std::size_t CountWhile(std::string_view text, std::uint8_t bit) noexcept {
  const auto *const end = std::find_if_not(text.begin(), text.end(), [bit](char c) { return Is(c, bit); });
  return static_cast<std::size_t>(end - text.begin());
}

bool ConsistsOf(std::string_view text, std::uint8_t bit) noexcept {
  return CountWhile(text, bit) == text.size();
}

/// Whether each character of `text` is in the class or escaped.
bool ConsistsOfEscapedOr(std::string_view text, std::uint8_t bit) noexcept {
  constexpr std::size_t ESCAPE_LENGTH = 3;
  for (text.remove_prefix(CountWhile(text, bit)); !text.empty(); text.remove_prefix(CountWhile(text, bit))) {
    if (text.size() < ESCAPE_LENGTH || text[0] != '%' || !Is(text[1], HEX) || !Is(text[2], HEX)) {
      return false;
    }
    text.remove_prefix(ESCAPE_LENGTH);
  }
  return true;
}

bool StartsWith(std::string_view text, std::string_view beginning) noexcept {
  return text.substr(0, beginning.size()) == beginning;
}

/// Removes from `text` everything before the first of `stops`, or all of it. @return what was removed.
std::string_view Take(std::string_view &text, std::string_view stops) noexcept {
  const auto end = std::find_first_of(text.begin(), text.end(), stops.begin(), stops.end());
  const std::string_view taken = text.substr(0, static_cast<std::size_t>(end - text.begin()));
  text.remove_prefix(taken.size());
  return taken;
}

/// The scheme at the start of `text`, without the ":" that ends it; `std::nullopt` when there is no scheme.
std::optional<std::string_view> FindScheme(std::string_view text) noexcept {
  const std::size_t length = CountWhile(text, SCHEME);
  if (length == text.size() || text[length] != ':' || !Is(text.front(), ALPHA)) {
    return std::nullopt;
  }
  return text.substr(0, length);
}

/// Sets the parts of `authority`. @return whether it is valid; an IP literal is not checked.
bool SplitAuthority(std::string_view authority, UriReference &parts) noexcept {
  if (const std::size_t at = authority.find('@'); at != NPOS) {
    parts.userInformation = authority.substr(0, at);
    authority.remove_prefix(at + 1);
  }
  const bool isBracketed = StartsWith(authority, "[");
  const std::size_t hostEnd = isBracketed ? authority.find(']') : std::min(authority.find(':'), authority.size());
  if (hostEnd == NPOS) {
    return false;
  }
  parts.host = authority.substr(0, hostEnd + (isBracketed ? 1 : 0));
  authority.remove_prefix(parts.host->size());
  if (!authority.empty()) {
    parts.port = authority.substr(1);
  }
  return (authority.empty() || authority.front() == ':') && ConsistsOf(parts.port.value_or(""), DIGIT) &&
         (isBracketed || ConsistsOfEscapedOr(*parts.host, NAME)) &&
         ConsistsOfEscapedOr(parts.userInformation.value_or(""), USER);
}

/// Whether the path is valid. Without a scheme, its first segment must not contain a ":", because a ":" would end a
/// scheme. After an authority the first segment is always empty.
bool IsPath(const UriReference &parts) noexcept {
  const std::string_view first = parts.path.substr(0, parts.path.find('/'));
  return ConsistsOfEscapedOr(parts.path, PATH) && (parts.scheme || first.find(':') == NPOS);
}

bool IsIPv6Address(std::string_view text) noexcept {
  std::array<char, INET6_ADDRSTRLEN> copy{}; // ends with a null character
  if (text.size() >= copy.size() || text.find('\0') != NPOS) {
    return false;
  }
  std::copy(text.begin(), text.end(), copy.begin());
  in6_addr address;
  return inet_pton(AF_INET6, copy.data(), &address) == 1;
}

/// "v", hexadecimal digits, "." and an address in a form that a later standard defines.
bool IsLaterAddress(std::string_view text) noexcept {
  if (text.empty() || (text.front() != 'v' && text.front() != 'V')) {
    return false;
  }
  text.remove_prefix(1);
  const std::size_t versionLength = CountWhile(text, HEX);
  text.remove_prefix(versionLength);
  return versionLength > 0 && text.size() > 1 && text.front() == '.' && ConsistsOf(text.substr(1), USER);
}

} // namespace

std::optional<UriReference> SplitUriReference(std::string_view text) noexcept {
  UriReference parts;
  parts.scheme = FindScheme(text);
  if (parts.scheme) {
    text.remove_prefix(parts.scheme->size() + 1);
  }
  if (StartsWith(text, "//")) {
    text.remove_prefix(2);
    if (!SplitAuthority(Take(text, "/?#"), parts)) {
      return std::nullopt;
    }
  }
  parts.path = Take(text, "?#");
  if (StartsWith(text, "?")) {
    parts.query = Take(text, "#").substr(1);
  }
  if (!text.empty()) {
    parts.fragment = text.substr(1);
  }
  if (!IsPath(parts) || !ConsistsOfEscapedOr(parts.query.value_or(""), QUERY) ||
      !ConsistsOfEscapedOr(parts.fragment.value_or(""), QUERY)) {
    return std::nullopt;
  }
  return parts;
}

bool IsIpLiteral(std::string_view host) noexcept {
  if (host.size() < 2 || host.front() != '[' || host.back() != ']') {
    return false;
  }
  const std::string_view address = host.substr(1, host.size() - 2);
  return IsIPv6Address(address) || IsLaterAddress(address);
}

bool IsUriReference(std::string_view text) noexcept {
  const std::optional<UriReference> parts = SplitUriReference(text);
  return parts && (!StartsWith(parts->host.value_or(""), "[") || IsIpLiteral(*parts->host));
}

} // namespace Tarvel
