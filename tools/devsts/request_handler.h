// SPDX-License-Identifier: Apache-2.0
/// @file
/// From an HTTP request to the delivery of its answer: paths, methods, media types, faults, the log.

#pragma once

#include "certificate.h"
#include "charset.h"
#include "delivery.h"
#include "echo_service.h"
#include "token_service.h"

#include <functional>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <string_view>

namespace DevSts {

struct HttpRequest {
  std::string peer; ///< address and port, for the log
  std::string method;
  std::string target;
  std::string contentType;
  std::string soapAction;
  std::string body;
  bool keepOpen = true;
  Certificate peerCertificate; ///< of the TLS client; null when it has none
};

/// Any number of threads may use it at once.
class RequestHandler {
public:
  /// The services outlive the handler. `fault` is for every request to `service` whose path has no fault; `charset` is
  /// for every message.
  RequestHandler(const TokenService &service, const EchoService &echo, const Fault &fault, const Charset &charset)
      : m_service(service), m_echo(echo), m_fault(fault), m_charset(charset) {}

  Delivery Handle(const HttpRequest &request) const noexcept;

private:
  Delivery Answer(const HttpRequest &request) const;
  Delivery AnswerRequest(const HttpRequest &request, const Fault &fault) const;
  Delivery AnswerEcho(const HttpRequest &request) const;
  Delivery AnswerWith(const HttpRequest &request, const SoapAnswer &answer, std::string_view mediaType,
                      const Fault &fault) const;
  /// The fault in a path below /sts/fault/; none for an unknown name.
  std::optional<Fault> FaultOf(std::string_view path) const;
  /// Whether this is the first request to that path, which contains /once/.
  bool IsFirst(std::string_view onceOnly) const;

  const TokenService &m_service;
  const EchoService &m_echo;
  const Fault m_fault;
  const Charset m_charset;
  mutable std::mutex m_mutex;
  mutable std::set<std::string, std::less<>> m_met; ///< guarded by the mutex
};

/// Writes one line to standard error, with the time. Characters that could control a terminal are escaped.
void LogLine(const std::string &line) noexcept;

} // namespace DevSts
