// SPDX-License-Identifier: Apache-2.0
/// @file
/// Tests of the commands that sign and check messages, with a running development service.

#pragma once

#include "expect_result.h"
#include "refusals.h"
#include "service_test.h"

#include <string>
#include <vector>

namespace ToolTest {

constexpr const char *SOAP11 = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr const char *SOAP12 = "http://www.w3.org/2003/05/soap-envelope";
constexpr const char *MESSAGE_HINT = "ssoclient check-message --explain shows each check of the message";

/// The content of the body in `envelope.xml`.
constexpr const char *ORDER = "<m:Order xmlns:m=\"urn:example:orders\">7</m:Order>";

/// An envelope with the header blocks To (of WS-Addressing), {urn:example:trace}Trace and Plain.
inline std::string Envelope(const std::string &soap = SOAP11) {
  return "<s:Envelope xmlns:s=\"" + soap +
         "\"><s:Header><wsa:To xmlns:wsa=\"http://www.w3.org/2005/08/addressing\">urn:to</wsa:To><t:Trace "
         "xmlns:t=\"urn:example:trace\">5</t:Trace><Plain/></s:Header><s:Body>" +
         ORDER + "</s:Body></s:Envelope>\n";
}

/// Each test has, in addition to the files of `ServiceTest`, token.xml and bearer.xml, tokens of the service, the first bound
/// to the key client.key, and envelope.xml.
class MessageTest : public ServiceTest {
protected:
  explicit MessageTest(const std::vector<std::string> &arguments = {}) : ServiceTest(arguments) {
    Acquire("token.xml", IDENTITY);
    Acquire("bearer.xml", PASSWORD);
    m_folder.Write("envelope.xml", Envelope());
  }

  /// The message that `ssoclient sign` writes with these options. @throws std::runtime_error when it fails
  std::string Sign(const std::string &options = "--token token.xml --key client.key envelope.xml") const {
    const Result result = Run("ssoclient sign " + options);
    if (result.exitCode != 0 || !result.err.empty()) {
      throw std::runtime_error(result.err);
    }
    return result.out;
  }

  /// Checks the message, which it writes to message.xml.
  Result Check(const std::string &message, const std::string &options = {}) const {
    m_folder.Write("message.xml", message);
    return Run("ssoclient check-message --trust sts.pem " + options + " message.xml");
  }

  /// Expects the message to be refused with a hint.
  void ExpectRefused(const std::string &message, int exitCode, const std::string &label, const std::string &reason,
                     const std::string &options = {}) const {
    ExpectResult(Check(message, options), exitCode, "", RefusalText(label, reason, MESSAGE_HINT));
  }
};

/// `text` with the first `from` replaced. @throws std::runtime_error when there is none
inline std::string Replaced(std::string text, const std::string &from, const std::string &to) {
  const std::size_t at = text.find(from);
  if (at == std::string::npos) {
    throw std::runtime_error("'" + from + "' is not in\n" + text);
  }
  return text.replace(at, from.size(), to);
}

/// The text between the first `begin` and the next `end`. @throws std::runtime_error when one of them is missing
inline std::string Between(const std::string &text, const std::string &begin, const std::string &end) {
  const std::size_t first = text.find(begin);
  const std::size_t last = text.find(end, first + begin.size());
  if (first == std::string::npos || last == std::string::npos) {
    throw std::runtime_error("'" + begin + "' is not in\n" + text);
  }
  return text.substr(first + begin.size(), last - first - begin.size());
}

} // namespace ToolTest
