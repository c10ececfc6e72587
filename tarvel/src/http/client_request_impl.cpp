// SPDX-License-Identifier: Apache-2.0

#include "http/client_request_impl.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <string>
#include <utility>

namespace Tarvel::Http {

namespace {

/// Headers that a caller cannot set, because a second header of the same name would make the message ambiguous. The
/// user agent sets them itself, except Transfer-Encoding and Expect, which it never sends.
constexpr std::array<std::string_view, 7> OWN_HEADERS{
    "Accept-Encoding", "Connection", "Content-Length", "Cookie", "Host", "Transfer-Encoding", "Expect"};

constexpr std::string_view USER_AGENT = "tarvel";

bool IsTargetCharacter(char c) noexcept {
  return c > ' ' && c < 0x7F && c != '#';
}

void AppendHeader(std::string &message, std::string_view name, std::string_view value) {
  message.append(name).append(": ").append(value).append("\r\n");
}

bool HasHeader(const HeaderFields &headers, std::string_view name) {
  return std::any_of(headers.begin(), headers.end(),
                     [name](const auto &header) { return EqualsIgnoringCase(header.first, name); });
}

std::string SerialiseHeader(const RequestData &request, std::string_view host, std::string_view cookies) {
  std::string header = request.method + " " + request.target + " HTTP/1.1\r\n";
  AppendHeader(header, "Host", host);
  if (!HasHeader(request.headers, "User-Agent")) {
    AppendHeader(header, "User-Agent", USER_AGENT);
  }
  for (const auto &[name, value] : request.headers) {
    AppendHeader(header, name, value);
  }
  if (!cookies.empty()) {
    AppendHeader(header, "Cookie", cookies);
  }
  AppendHeader(header, "Accept-Encoding", "identity");
  AppendHeader(header, "Connection", "close");
  // RFC 9110, section 8.6: a request without a body states a length only if its method normally has a body.
  const std::size_t bodyLength = request.body.Get().size();
  if (bodyLength > 0 || request.method == "POST" || request.method == "PUT") {
    AppendHeader(header, "Content-Length", std::to_string(bodyLength));
  }
  header.append("\r\n");
  return header;
}

} // namespace

SecretText Serialise(const RequestData &request, std::string_view host, std::string_view cookies) {
  const std::string header = SerialiseHeader(request, host, cookies);
  std::string message;
  message.reserve(header.size() +
                  request.body.Get().size()); // if it grew later, it would leave copies of the body in memory
  message.append(header).append(request.body.Get());
  return SecretText(std::move(message));
}

ClientRequestImpl::ClientRequestImpl(std::string_view method, std::string_view path) {
  if (!IsToken(method)) {
    throw InvalidArgumentException("the method of an HTTP request is not a token.");
  }
  if (path.empty() || path.front() != '/' || !std::all_of(path.begin(), path.end(), IsTargetCharacter)) {
    throw InvalidArgumentException(
        "the path of an HTTP request does not begin with '/', or contains a blank, a fragment, a "
        "control character or one that is not ASCII.");
  }
  m_data.method = std::string(method);
  m_data.target = std::string(path);
}

void ClientRequestImpl::SetHeader(std::string_view name, std::string_view value) {
  if (!IsToken(name)) {
    throw InvalidArgumentException("the name of an HTTP header is not a token.");
  }
  if (!IsFieldValue(value)) {
    throw InvalidArgumentException("the value of the HTTP header " + StringUtil::Shorten(name) +
                                   " contains a control character.");
  }
  const auto isName = [name](std::string_view other) { return EqualsIgnoringCase(other, name); };
  if (std::any_of(OWN_HEADERS.begin(), OWN_HEADERS.end(), isName)) {
    throw InvalidArgumentException("the HTTP header " + StringUtil::Shorten(name) + " is set by the user agent.");
  }
  const auto same = std::find_if(m_data.headers.begin(), m_data.headers.end(),
                                 [&isName](const auto &header) { return isName(header.first); });
  if (same != m_data.headers.end()) {
    same->second = std::string(value);
    return;
  }
  m_data.headers.emplace_back(name, value);
}

void ClientRequestImpl::WriteBody(std::string_view bytes) {
  m_data.body.Append(bytes);
}

RequestData ClientRequestImpl::Take() {
  if (std::exchange(m_isTaken, true)) {
    throw InvalidStateException("The HTTP request has been started already");
  }
  return std::move(m_data);
}

} // namespace Tarvel::Http
