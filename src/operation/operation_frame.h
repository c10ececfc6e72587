// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationFrame`, which logs the start and the end of an operation.

#pragma once

#include <string>

namespace SsoClient {

/// The two lines of one kind of operation; %1 is the UUID, %2 the operation's name. They live as long as the process.
struct FrameLines {
  const char *start;
  const char *end;
};

/// The lines for the operations of `SecurityTokenService`.
constexpr FrameLines SERVICE_LINES{"opId=%1 START operation SecurityTokenServiceImpl::%2",
                                   "opId=%1 END operation SecurityTokenServiceImpl::%2"};

/// The lines for the operations of `TokenClient`.
constexpr FrameLines CLIENT_LINES{"opId=%1 START operation TokenClient::%2", "opId=%1 END operation TokenClient::%2"};

/// Logs the start when it is created, and the end once: in `LogEnd`, or when it is destroyed, after a return or an
/// exception. Both lines have the same new UUID.
class OperationFrame {
public:
  explicit OperationFrame(const std::string &operationName, const FrameLines &lines = SERVICE_LINES);
  OperationFrame(const OperationFrame &) = delete;
  OperationFrame &operator=(const OperationFrame &) = delete;
  ~OperationFrame() { LogEnd(); }

  /// Logs the end, unless it has been logged.
  void LogEnd() noexcept;

  /// The UUID.
  const std::string &GetId() const noexcept { return m_opId; }

private:
  std::string m_opId;
  std::string m_operationName;
  const char *m_endLine; // null after the end has been logged
};

} // namespace SsoClient
