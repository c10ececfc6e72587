// SPDX-License-Identifier: Apache-2.0
/// @file
/// `IssueWatch`, an observer that notices when the service issues a token.

#pragma once

#include <ssoclient/operation_observer.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <memory>
#include <mutex>

namespace SsoClient::Tool {

/// Also passes each event on to another observer.
class IssueWatch final : public OperationObserver {
public:
  /// @param next the other observer; null if there is none
  explicit IssueWatch(std::shared_ptr<OperationObserver> next) : m_next(std::move(next)) {}

  /// When the service was asked for the latest token that it has issued, by this machine's clock; `boost::none` if it
  /// has not issued any token.
  boost::optional<Tarvel::System::DateTime> GetAskedAt() const;

  void OnStarted(const OperationInfo &operation) override;
  void OnRequestSent(const OperationInfo &operation, const RequestSentEvent &event) override;
  void OnResponseReceived(const OperationInfo &operation, const ResponseReceivedEvent &event) override;
  void OnFault(const OperationInfo &operation, const FaultEvent &event) override;
  void OnEnded(const OperationInfo &operation, const OperationEndedEvent &event) override;

private:
  const std::shared_ptr<OperationObserver> m_next;
  mutable std::mutex m_mutex; // guards what follows
  Tarvel::System::DateTime m_startedAt;
  boost::optional<Tarvel::System::DateTime> m_askedAt;
};

} // namespace SsoClient::Tool
