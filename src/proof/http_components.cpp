// SPDX-License-Identifier: Apache-2.0

#include "proof/http_components.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/string_util.h>
#include <tarvel/http/url.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Tarvel::StringUtil;

constexpr int HTTP_PORT = 80;
constexpr int HTTPS_PORT = 443;
constexpr std::string_view BLANKS_AND_TABS = " \t";

char LowerCase(char c) noexcept {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool IsLetterOrDigit(char c) noexcept {
  const char lower = LowerCase(c);
  return (lower >= 'a' && lower <= 'z') || (c >= '0' && c <= '9');
}

/// A name that was received, for a message.
std::string Quote(std::string_view text) {
  return '"' + StringUtil::Printable(StringUtil::Shorten(text)) + '"';
}

std::string_view Trim(std::string_view text) noexcept {
  const std::size_t begin = text.find_first_not_of(BLANKS_AND_TABS);
  return begin == std::string_view::npos ? std::string_view()
                                         : text.substr(begin, text.find_last_not_of(BLANKS_AND_TABS) + 1 - begin);
}

/// The length of the line break at `position`, with the blanks after it that continue the line (RFC 9112, section 5.2); 0 if
/// there is no such break.
std::size_t FoldLength(std::string_view value, std::size_t position) noexcept {
  constexpr std::string_view LINE_END = "\r\n";
  if (value.substr(position, LINE_END.size()) != LINE_END) {
    return 0;
  }
  const std::size_t blanks = position + LINE_END.size();
  const std::size_t end = std::min(value.find_first_not_of(BLANKS_AND_TABS, blanks), value.size());
  return end > blanks ? end - position : 0;
}

/// The value without blanks around it, and with one blank in place of each folded line and the blanks around the fold.
std::string Unfold(std::string_view value) {
  std::string text;
  for (std::size_t position = 0; position < value.size();) {
    const std::size_t fold = FoldLength(value, position);
    if (fold == 0) {
      text += value[position++];
      continue;
    }
    text.erase(text.find_last_not_of(BLANKS_AND_TABS) + 1);
    text += ' ';
    position += fold;
  }
  return std::string(Trim(text));
}

void RequireFieldValue(const std::string &name, std::string_view value) {
  for (std::size_t position = 0; position < value.size(); ++position) {
    const std::size_t fold = FoldLength(value, position);
    if (fold == 0 && IsForbiddenInField(value[position])) {
      throw InvalidMessageException("The header field " + StringUtil::Shorten(name) + " contains a control character");
    }
    position += fold > 0 ? fold - 1 : 0;
  }
}

} // namespace

HttpComponents::HttpComponents(const HttpRequest &request) : m_method(request.method), m_targetUri(request.targetUri) {
  if (!IsHttpToken(m_method)) {
    throw InvalidMessageException("The method of the request is not valid: " + Quote(m_method));
  }
  ReadTarget(request.targetUri);
  ReadFields(request);
}

void HttpComponents::ReadTarget(const std::string &target) {
  if (target.find('#') != std::string::npos) {
    throw InvalidMessageException("The target of the request has a fragment: " + Quote(target));
  }
  std::string host;
  int port = 0;
  try {
    Tarvel::Http::ParseHttpURL(target, m_isSecure, host, port, m_pathAndQuery);
  } catch (const Tarvel::Http::MalformedURLException &exception) {
    throw InvalidMessageException(std::string("The target of the request is not valid: ") + exception.what());
  }
  const bool isAddress = host.find(':') != std::string::npos; // of IPv6
  m_authority = FieldNameInLowerCase(isAddress ? '[' + host + ']' : host);
  if (port != (m_isSecure ? HTTPS_PORT : HTTP_PORT)) {
    m_authority += ':' + std::to_string(port);
  }
}

void HttpComponents::ReadFields(const HttpRequest &request) {
  std::size_t octets = 0;
  for (const auto &[name, value] : request.headers) {
    octets += name.size() + value.size();
    if (octets > MAX_HTTP_HEADER_OCTETS) {
      throw InvalidMessageException("The header fields of the request have more than " +
                                    std::to_string(MAX_HTTP_HEADER_OCTETS) + " octets");
    }
    if (!IsHttpToken(name)) {
      throw InvalidMessageException("The request has a header field whose name is not valid: " + Quote(name));
    }
    RequireFieldValue(name, value);
    m_fields.emplace_back(FieldNameInLowerCase(name), value);
  }
  std::stable_sort(m_fields.begin(), m_fields.end(),
                   [](const Field &left, const Field &right) { return left.first < right.first; });
}

std::optional<std::string> HttpComponents::FindDerived(std::string_view name) const {
  const std::size_t query = m_pathAndQuery.find('?');
  if (name == "@method") {
    return std::string(m_method);
  }
  if (name == "@target-uri") {
    return std::string(m_targetUri);
  }
  if (name == "@scheme") {
    return m_isSecure ? "https" : "http";
  }
  if (name == "@authority") {
    return m_authority;
  }
  if (name == "@request-target") {
    return m_pathAndQuery;
  }
  if (name == "@path") {
    return m_pathAndQuery.substr(0, query);
  }
  if (name == "@query") {
    return query == std::string::npos ? "?" : m_pathAndQuery.substr(query);
  }
  return std::nullopt;
}

std::optional<std::string> HttpComponents::FindField(std::string_view name) const {
  const auto [first, last] = EqualRange(name);
  if (first == last) {
    return std::nullopt;
  }
  std::string text = Unfold(first->second);
  for (auto field = first + 1; field != last; ++field) {
    text += ", " + Unfold(field->second);
  }
  return text;
}

std::size_t HttpComponents::CountFields(std::string_view name) const noexcept {
  const auto [first, last] = EqualRange(name);
  return static_cast<std::size_t>(last - first);
}

std::pair<HttpComponents::Fields::const_iterator, HttpComponents::Fields::const_iterator>
HttpComponents::EqualRange(std::string_view name) const noexcept {
  const auto first =
      std::partition_point(m_fields.begin(), m_fields.end(), [name](const Field &field) { return field.first < name; });
  const auto last =
      std::partition_point(first, m_fields.end(), [name](const Field &field) { return field.first == name; });
  return {first, last};
}

std::string FieldNameInLowerCase(std::string_view name) {
  std::string lower(name);
  std::transform(lower.begin(), lower.end(), lower.begin(), LowerCase);
  return lower;
}

bool IsHttpToken(std::string_view text) noexcept {
  constexpr std::string_view SPECIALS = "!#$%&'*+-.^_`|~";
  return !text.empty() && std::all_of(text.begin(), text.end(), [SPECIALS](char c) {
    return IsLetterOrDigit(c) || SPECIALS.find(c) != std::string_view::npos;
  });
}

bool IsForbiddenInField(char c) noexcept {
  constexpr char DEL = 0x7F;
  return (c >= '\0' && c < ' ' && c != '\t') || c == DEL;
}

} // namespace SsoClient
