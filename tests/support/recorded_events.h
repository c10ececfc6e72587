// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RecordedEvents`, an observer that records the events of all operations as lines.

#pragma once

#include <ssoclient/operation_observer.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <vector>

namespace Testing {

/// The lines of an operation:
/// - "started NAME",
/// - "sent ACTION" and, in a negotiation, ", leg N",
/// - "received STATUS REASON, CONTENT-TYPE" or "received nothing: WHY", and the leg,
/// - "fault {NAMESPACE}NAME CODE: TEXT (DETAIL)",
/// - "ended", or "ended CLASS: MESSAGE".
class RecordedEvents final : public SsoClient::OperationObserver {
public:
  void OnStarted(const SsoClient::OperationInfo &operation) override;
  void OnRequestSent(const SsoClient::OperationInfo &operation, const SsoClient::RequestSentEvent &event) override;
  void OnResponseReceived(const SsoClient::OperationInfo &operation,
                          const SsoClient::ResponseReceivedEvent &event) override;
  void OnFault(const SsoClient::OperationInfo &operation, const SsoClient::FaultEvent &event) override;
  void OnEnded(const SsoClient::OperationInfo &operation, const SsoClient::OperationEndedEvent &event) override;

  /// All lines, in the order of the calls.
  std::vector<std::string> Lines() const;

  /// The lines of each operation, by its identifier.
  std::map<std::string, std::vector<std::string>> LinesById() const;

  /// The lengths of the bodies, in the order of the calls.
  std::vector<std::size_t> Octets() const;

  /// The durations of exchanges and operations, in the order of the calls.
  std::vector<std::int64_t> Durations() const;

  /// The last fault as it was reported.
  SsoClient::FaultEvent LastFault() const;

private:
  void Add(const SsoClient::OperationInfo &operation, const std::string &line);

  mutable std::mutex m_mutex;
  std::vector<std::string> m_lines;
  std::map<std::string, std::vector<std::string>> m_linesById;
  std::vector<std::size_t> m_octets;
  std::vector<std::int64_t> m_durations;
  SsoClient::FaultEvent m_fault;
};

} // namespace Testing
