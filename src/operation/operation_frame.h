// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationFrame`, which logs the start and the end of an operation.

#pragma once

#include <string>

namespace SsoClient {

/// Logs the start when it is created, and the end once: at the latest when it is destroyed, after a return or an exception.
/// Both lines have the same new UUID.
class OperationFrame {
public:
  /// @param className of the object that runs the operation; it is part of both lines
  explicit OperationFrame(const std::string &operationName, const char *className = "SecurityTokenServiceImpl");
  OperationFrame(const OperationFrame &) = delete;
  OperationFrame &operator=(const OperationFrame &) = delete;
  ~OperationFrame() { LogEnd(); }

  /// Logs the end, unless that was done before.
  void LogEnd() noexcept;

  /// The UUID.
  const std::string &GetId() const noexcept { return m_opId; }

private:
  std::string m_opId;
  std::string m_operationName;
  const char *m_className; // null after the end has been logged
};

} // namespace SsoClient
