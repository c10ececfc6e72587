// SPDX-License-Identifier: Apache-2.0

#include "issue_watch.h"

namespace SsoClient::Tool {

boost::optional<Tarvel::System::DateTime> IssueWatch::GetAskedAt() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_askedAt;
}

void IssueWatch::OnStarted(const OperationInfo &operation) {
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_startedAt = Tarvel::System::GetUtcDateTime();
  }
  if (m_next) {
    m_next->OnStarted(operation);
  }
}

void IssueWatch::OnRequestSent(const OperationInfo &operation, const RequestSentEvent &event) {
  if (m_next) {
    m_next->OnRequestSent(operation, event);
  }
}

void IssueWatch::OnResponseReceived(const OperationInfo &operation, const ResponseReceivedEvent &event) {
  if (m_next) {
    m_next->OnResponseReceived(operation, event);
  }
}

void IssueWatch::OnFault(const OperationInfo &operation, const FaultEvent &event) {
  if (m_next) {
    m_next->OnFault(operation, event);
  }
}

void IssueWatch::OnEnded(const OperationInfo &operation, const OperationEndedEvent &event) {
  if (event.outcome == OperationEndedEvent::Outcome::SUCCEEDED) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_askedAt = m_startedAt;
  }
  if (m_next) {
    m_next->OnEnded(operation, event);
  }
}

} // namespace SsoClient::Tool
