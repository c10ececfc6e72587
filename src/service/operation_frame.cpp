// SPDX-License-Identifier: Apache-2.0

#include "service/operation_frame.h"

#include <ssoclient/logger.h>
#include <tarvel/core/string_util.h>

namespace SsoClient {

using Tarvel::Service::LogInternal;

OperationFrame::OperationFrame(const std::string &operationName)
    : m_opId(Tarvel::StringUtil::GenerateUuid()), m_operationName(operationName) {
  LogInternal(getLogger(), LOG_LEVEL_OPERATION, "opId=%1 START operation SecurityTokenServiceImpl::%2", m_opId,
              m_operationName);
}

OperationFrame::~OperationFrame() {
  try {
    LogInternal(getLogger(), LOG_LEVEL_OPERATION, "opId=%1 END operation SecurityTokenServiceImpl::%2", m_opId,
                m_operationName);
  } catch (...) {
    // Out of memory: the line is lost, but the outcome of the operation is not.
  }
}

} // namespace SsoClient
