// SPDX-License-Identifier: Apache-2.0

#include "operation/operation_frame.h"

#include <ssoclient/logger.h>
#include <tarvel/core/string_util.h>

#include <utility>

namespace SsoClient {

using Tarvel::Service::LogInternal;

OperationFrame::OperationFrame(const std::string &operationName, const char *className)
    : m_opId(Tarvel::StringUtil::GenerateUuid()), m_operationName(operationName), m_className(className) {
  LogInternal(getLogger(), LOG_LEVEL_OPERATION, "opId=%1 START operation %2::%3", m_opId, m_className, m_operationName);
}

void OperationFrame::LogEnd() noexcept {
  const char *const className = std::exchange(m_className, nullptr);
  if (!className) {
    return;
  }
  try {
    LogInternal(getLogger(), LOG_LEVEL_OPERATION, "opId=%1 END operation %2::%3", m_opId, className, m_operationName);
  } catch (...) {
    // Out of memory: the line is lost, but the outcome of the operation is not.
  }
}

} // namespace SsoClient
