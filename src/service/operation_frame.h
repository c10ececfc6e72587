// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationFrame`, which brackets an operation in the log.

#pragma once

#include <string>

namespace SsoClient {

/// Logs the start when it is made and the end when it goes, by return or by exception; one new UUID ties the two.
class OperationFrame {
public:
  explicit OperationFrame(const std::string &operationName);
  OperationFrame(const OperationFrame &) = delete;
  OperationFrame &operator=(const OperationFrame &) = delete;
  ~OperationFrame();

private:
  std::string m_opId;
  std::string m_operationName;
};

} // namespace SsoClient
