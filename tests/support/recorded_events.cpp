// SPDX-License-Identifier: Apache-2.0

#include "support/recorded_events.h"

namespace Testing {

namespace {

using SsoClient::OperationInfo;

std::string LegSuffix(int leg) {
  return leg == 0 ? "" : ", leg " + std::to_string(leg);
}

} // namespace

void RecordedEvents::OnStarted(const OperationInfo &operation) {
  Add(operation, "started " + operation.name);
}

void RecordedEvents::OnRequestSent(const OperationInfo &operation, const SsoClient::RequestSentEvent &event) {
  Add(operation, "sent " + event.action + LegSuffix(event.leg));
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_octets.push_back(event.requestOctets);
}

void RecordedEvents::OnResponseReceived(const OperationInfo &operation, const SsoClient::ResponseReceivedEvent &event) {
  Add(operation, event.status == 0 ? "received nothing: " + event.reason + LegSuffix(event.leg)
                                   : "received " + std::to_string(event.status) + " " + event.reason + ", " +
                                         event.contentType + LegSuffix(event.leg));
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_octets.push_back(event.responseOctets);
  m_durations.push_back(event.durationMicroseconds);
}

void RecordedEvents::OnFault(const OperationInfo &operation, const SsoClient::FaultEvent &event) {
  Add(operation, "fault {" + event.codeNamespace + "}" + event.codeName + " " + event.code + ": " + event.text + " (" +
                     event.detail + ")");
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_fault = event;
}

void RecordedEvents::OnEnded(const OperationInfo &operation, const SsoClient::OperationEndedEvent &event) {
  const bool hasFailed = event.outcome == SsoClient::OperationEndedEvent::Outcome::FAILED;
  Add(operation, hasFailed ? "ended " + event.exceptionClass + ": " + event.message
                           : "ended" + event.exceptionClass + event.message);
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_durations.push_back(event.durationMicroseconds);
}

std::vector<std::string> RecordedEvents::Lines() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_lines;
}

std::map<std::string, std::vector<std::string>> RecordedEvents::LinesById() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_linesById;
}

std::vector<std::size_t> RecordedEvents::Octets() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_octets;
}

std::vector<std::int64_t> RecordedEvents::Durations() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_durations;
}

SsoClient::FaultEvent RecordedEvents::LastFault() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_fault;
}

void RecordedEvents::Add(const OperationInfo &operation, const std::string &line) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_lines.push_back(line);
  m_linesById[operation.id].push_back(line);
}

} // namespace Testing
