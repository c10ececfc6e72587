// SPDX-License-Identifier: Apache-2.0

#include "operation/operation_frame.h"

#include <ssoclient/logger.h>
#include <tarvel/core/string_util.h>

#include <utility>

namespace SsoClient {

using Tarvel::Service::LogInternal;

OperationFrame::OperationFrame(const std::string &operationName, const FrameLines &lines)
    : m_opId(Tarvel::StringUtil::GenerateUuid()), m_operationName(operationName), m_endLine(lines.end) {
  LogInternal(getLogger(), LOG_LEVEL_OPERATION, lines.start, m_opId, m_operationName);
}

void OperationFrame::LogEnd() noexcept {
  const char *const line = std::exchange(m_endLine, nullptr);
  if (!line) {
    return;
  }
  try {
    LogInternal(getLogger(), LOG_LEVEL_OPERATION, line, m_opId, m_operationName);
  } catch (...) {
    // Out of memory: the line is lost, but the outcome of the operation is not.
  }
}

} // namespace SsoClient
