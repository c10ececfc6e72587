// SPDX-License-Identifier: Apache-2.0

#include "request_handler.h"

#include <array>
#include <cctype>
#include <cstdio>
#include <string_view>

#include <unistd.h>

namespace DevSts {

namespace {

constexpr std::string_view PATH = "/sts";
constexpr std::string_view FAULT_PATH = "/sts/fault/";
constexpr std::string_view ONCE = "/once/"; // follows the name of a fault; each path with it is counted separately
constexpr std::string_view ECHO_PATH = "/echo";
constexpr const char *ONLY_POST = "Only POST is answered.\n";
constexpr const char *WRONG_CHARSET = "The message is not in the service's charset.\n";

std::string Lower(std::string_view text) {
  std::string lower(text);
  for (char &c : lower) {
    c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  }
  return lower;
}

/// The media type in lower case, without parameters.
std::string MediaTypeOf(std::string_view contentType) {
  const std::string type = Lower(contentType.substr(0, contentType.find(';')));
  return type.substr(0, type.find_last_not_of(" \t") + 1);
}

std::string_view Unquoted(std::string_view text) {
  const bool isQuoted = text.size() >= 2 && text.front() == '"' && text.back() == '"';
  return isQuoted ? text.substr(1, text.size() - 2) : text;
}

Delivery Plain(int status, const char *text, bool keepOpen) {
  return Deliver({status, "text/plain", text}, Fault(), keepOpen);
}

} // namespace

void LogLine(const std::string &line) noexcept {
  try {
    std::string text = TimeText(Now()) + " ";
    for (const char c : line) {
      const auto byte = static_cast<unsigned char>(c);
      const bool isPlain = byte >= 0x20 && byte < 0x7F;
      std::array<char, 8> escaped{};
      std::snprintf(escaped.data(), escaped.size(), "\\x%02X", byte);
      text += isPlain ? std::string(1, c) : std::string(escaped.data());
    }
    text += '\n';
    // A single call, so that lines of several threads do not mix. A log that cannot be written is ignored.
    [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, text.data(), text.size());
  } catch (const std::exception &) { // NOLINT(bugprone-empty-catch): out of memory; the line is lost
  }
}

Delivery RequestHandler::Answer(const HttpRequest &request) const {
  if (request.target == ECHO_PATH) {
    return AnswerEcho(request);
  }
  if (request.target == PATH) {
    return AnswerRequest(request, m_fault);
  }
  if (request.target.rfind(FAULT_PATH, 0) != 0) {
    return Plain(404, "The service is at /sts.\n", request.keepOpen);
  }
  const std::optional<Fault> named = FaultOf(std::string_view(request.target).substr(FAULT_PATH.size()));
  return named ? AnswerRequest(request, *named) : Plain(404, "No fault of that name.\n", request.keepOpen);
}

Delivery RequestHandler::AnswerRequest(const HttpRequest &request, const Fault &fault) const {
  if (request.method != "POST") {
    return Plain(405, ONLY_POST, request.keepOpen);
  }
  if (MediaTypeOf(request.contentType) != SOAP_1_1.mediaType) {
    return Plain(415, "A SOAP 1.1 message has the media type text/xml.\n", request.keepOpen);
  }
  if (IgnoresRequest(fault.delivery)) {
    LogLine(request.peer + " " + request.target + ": fault");
    return Deliver({}, fault, request.keepOpen);
  }
  const std::optional<std::string> message = m_charset.Decode(request.body);
  if (!message) {
    return Plain(400, WRONG_CHARSET, request.keepOpen);
  }
  const SoapAnswer answer = m_service.Answer(Unquoted(request.soapAction), *message, fault);
  return AnswerWith(request, answer, SOAP_1_1.mediaType, fault);
}

Delivery RequestHandler::AnswerEcho(const HttpRequest &request) const {
  if (request.method != "POST") {
    return Plain(405, ONLY_POST, request.keepOpen);
  }
  const std::string type = MediaTypeOf(request.contentType);
  if (type != SOAP_1_1.mediaType && type != SOAP_1_2.mediaType) {
    return Plain(415, "A SOAP message has the media type text/xml or application/soap+xml.\n", request.keepOpen);
  }
  const std::optional<std::string> message = m_charset.Decode(request.body);
  if (!message) {
    return Plain(400, WRONG_CHARSET, request.keepOpen);
  }
  const SoapVersion &version = type == SOAP_1_2.mediaType ? SOAP_1_2 : SOAP_1_1;
  const SoapAnswer answer = m_echo.Answer(*message, version, request.peerCertificate.get());
  return AnswerWith(request, answer, version.mediaType, Fault());
}

Delivery RequestHandler::AnswerWith(const HttpRequest &request, const SoapAnswer &answer, std::string_view mediaType,
                                    const Fault &fault) const {
  LogLine(request.peer + " " + request.target + ": " + answer.log);
  HttpAnswer http;
  http.status = answer.status;
  http.contentType = m_charset.ContentType(mediaType);
  http.body = m_charset.Encode(answer.body);
  return Deliver(http, fault, request.keepOpen);
}

std::optional<Fault> RequestHandler::FaultOf(std::string_view path) const {
  const std::size_t once = path.find(ONCE);
  std::optional<Fault> fault = ParseFault(path.substr(0, once));
  if (fault && once != std::string_view::npos && !IsFirst(path)) {
    fault = Fault();
  }
  return fault;
}

bool RequestHandler::IsFirst(std::string_view onceOnly) const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_met.insert(std::string(onceOnly)).second;
}

Delivery RequestHandler::Handle(const HttpRequest &request) const noexcept {
  try {
    return Answer(request);
  } catch (const std::exception &failure) {
    LogLine(request.peer + ": failed: " + failure.what());
    return Plain(500, "The service has failed; see its log.\n", false);
  }
}

} // namespace DevSts
