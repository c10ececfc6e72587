// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/message_report.h>

#include "token/report_text.h"

namespace SsoClient {

const char *GetCheckName(MessageReport::Check check) noexcept {
  using Check = MessageReport::Check;
  switch (check) {
  case Check::WELL_FORMED:
    return "well-formed";
  case Check::ENVELOPE:
    return "envelope";
  case Check::SECURITY_HEADER:
    return "security-header";
  case Check::TIMESTAMP:
    return "timestamp";
  case Check::TOKEN:
    return "token";
  case Check::PROOF:
    return "proof";
  case Check::PARTS:
    return "parts";
  }
  return "unknown";
}

std::string WriteMessageReport(const MessageReport &report) {
  std::string text = WriteChecks("The message", report);
  return report.token ? text + "\n" + WriteTokenReport(*report.token) : text;
}

} // namespace SsoClient
