// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/url.h>

#include "core/uri_reference.h"
#include "http/header_syntax.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <arpa/inet.h>
#include <charconv>
#include <optional>

namespace Tarvel::Http {

TARVEL_DEFINE_EXCEPTION(MalformedURLException)

namespace {

constexpr int HTTP_PORT = 80;
constexpr int HTTPS_PORT = 443;
constexpr int MAX_PORT = 65535;
constexpr std::size_t MAX_HOST_LENGTH = 253; // RFC 1035, section 2.3.4, without the root's dot
constexpr std::size_t MAX_LABEL_LENGTH = 63;

bool IsDigit(char c) noexcept {
  return c >= '0' && c <= '9';
}

bool IsUrlCharacter(char c) noexcept {
  return c > ' ' && c < 0x7F;
}

bool IsHostCharacter(char c) noexcept {
  return IsDigit(c) || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '-' || c == '_';
}

std::string_view UpToPath(std::string_view text) {
  return text.substr(0, text.find_first_of("/?#"));
}

/// The authority as it is written: the text between the scheme's "://" and the path, the query or the fragment.
std::string_view FindAuthority(std::string_view url) {
  constexpr std::string_view START = "://";
  const std::size_t colon = url.find(':');
  if (colon == std::string_view::npos || url.substr(colon, START.size()) != START) {
    return {};
  }
  return UpToPath(url.substr(colon + START.size()));
}

/// Everything that may be user information, with the "@" after it; empty when there is none. It is assumed to end at
/// the last "@", because a password may contain characters that would end it, and the scheme may be missing.
std::string_view FindUserInformation(std::string_view url) {
  const std::string_view upToMark = url.substr(0, url.rfind('@') + 1);
  const std::size_t slashes = upToMark.find("//");
  return slashes == std::string_view::npos ? upToMark : upToMark.substr(slashes + 2);
}

/// `url` as a message may show it: without user information, which may contain a password, on one line and shortened.
std::string Quote(std::string_view url) {
  std::string text(url);
  if (const std::string_view user = FindUserInformation(url); !user.empty()) {
    text.replace(static_cast<std::size_t>(user.data() - url.data()), user.size(), "***@");
  }
  std::replace_if(
      text.begin(), text.end(), [](char c) { return IsControlCharacter(c); }, '?');
  return StringUtil::Shorten(text);
}

[[noreturn]] void Refuse(std::string_view url, const std::string &reason) {
  throw MalformedURLException("Malformed URL \"" + Quote(url) + "\": " + reason);
}

void CheckCharacters(std::string_view url) {
  if (url.empty()) {
    Refuse(url, "it is empty");
  }
  const std::string_view authority = FindAuthority(url);
  if (std::any_of(authority.begin(), authority.end(), [](char c) { return static_cast<unsigned char>(c) > 0x7F; })) {
    Refuse(url, "the host name is not ASCII (an internationalised name must be in its \"xn--\" form)");
  }
  if (!std::all_of(url.begin(), url.end(), IsUrlCharacter)) {
    Refuse(url, "it contains a character that is not allowed in a URL");
  }
}

/// The number in `digits`; nullopt when they are empty or the number is larger than an `int`.
std::optional<int> ReadNumber(std::string_view digits) noexcept {
  int number = 0;
  if (std::from_chars(digits.data(), digits.data() + digits.size(), number).ec != std::errc()) {
    return std::nullopt;
  }
  return number;
}

/// Does not check the text in the brackets of an address or the range of the port: their failures have other messages.
UriReference Parse(std::string_view url) {
  const std::optional<UriReference> parts = SplitUriReference(url);
  if (!parts || (parts->port && !ReadNumber(*parts->port))) {
    Refuse(url, "it does not have the form of a URL");
  }
  return *parts;
}

bool IsSecureScheme(std::string_view url, const UriReference &parts) {
  const std::string_view scheme = parts.scheme.value_or("");
  if (EqualsIgnoringCase(scheme, "https")) {
    return true;
  }
  if (!EqualsIgnoringCase(scheme, "http")) {
    Refuse(url, "the scheme is not http or https");
  }
  return false;
}

/// Four decimal numbers from 0 to 255. Forms that a resolver would read differently (octal, hexadecimal, fewer parts)
/// are not accepted.
bool IsIPv4Address(const std::string &host) {
  in_addr address;
  return inet_pton(AF_INET, host.c_str(), &address) == 1;
}

void CheckIPv6Address(std::string_view url, const std::string &host) {
  in6_addr address;
  if (inet_pton(AF_INET6, host.c_str(), &address) != 1) {
    Refuse(url, "the text in brackets is not an IPv6 address");
  }
}

/// Why `label` is not a valid part of a host name; empty when it is valid.
std::string RefuseLabel(std::string_view label) {
  if (label.empty()) {
    return "the host name has an empty part";
  }
  if (label.size() > MAX_LABEL_LENGTH) {
    return "a part of the host name is longer than 63 characters";
  }
  if (!std::all_of(label.begin(), label.end(), IsHostCharacter)) {
    return "the host name contains a character other than letters, digits, '-', '_' and '.'";
  }
  return {};
}

bool LooksLikeNumber(std::string_view label) {
  return std::all_of(label.begin(), label.end(), IsDigit) || EqualsIgnoringCase(label.substr(0, 2), "0x");
}

void CheckHostName(std::string_view url, const std::string &host) {
  std::string_view rest = host;
  if (rest.size() > 1 && rest.back() == '.') {
    rest.remove_suffix(1); // the dot of the root
  }
  if (rest.size() > MAX_HOST_LENGTH) {
    Refuse(url, "the host name is longer than 253 characters");
  }
  std::string_view label;
  for (bool isLast = false; !isLast;) {
    const std::size_t dot = rest.find('.');
    isLast = dot == std::string_view::npos;
    label = rest.substr(0, dot);
    if (const std::string refusal = RefuseLabel(label); !refusal.empty()) {
      Refuse(url, refusal);
    }
    rest.remove_prefix(isLast ? rest.size() : dot + 1);
  }
  if (LooksLikeNumber(label) && !IsIPv4Address(host)) {
    Refuse(url, "the host is not a complete IPv4 address");
  }
}

std::string FindHost(std::string_view url, const UriReference &parts) {
  if (parts.userInformation) {
    Refuse(url, "it contains user information");
  }
  std::string host(parts.host.value_or(""));
  if (host.empty()) {
    Refuse(url, "the host is missing");
  }
  if (host.front() == '[') {
    host = host.substr(1, host.size() - 2);
    CheckIPv6Address(url, host);
  } else {
    CheckHostName(url, host);
  }
  return host;
}

int FindPort(std::string_view url, const UriReference &parts, int defaultPort) {
  const int port = parts.port ? ReadNumber(*parts.port).value_or(0) : defaultPort;
  if (port < 1 || port > MAX_PORT) {
    Refuse(url, "the port is not between 1 and 65535");
  }
  return port;
}

/// Path and query as they are written: unescaping would change their meaning.
std::string FindPath(const UriReference &parts) {
  std::string path(parts.path.empty() ? "/" : parts.path);
  if (parts.query) {
    path.append("?").append(*parts.query);
  }
  return path;
}

} // namespace

void ParseHttpURL(std::string_view url, bool &isSecure, std::string &host, int &port, std::string &path) {
  CheckCharacters(url);
  const UriReference parts = Parse(url);
  const bool secure = IsSecureScheme(url, parts);
  std::string foundHost = FindHost(url, parts);
  const int foundPort = FindPort(url, parts, secure ? HTTPS_PORT : HTTP_PORT);

  path = FindPath(parts);
  isSecure = secure;
  host = std::move(foundHost);
  port = foundPort;
}

} // namespace Tarvel::Http
