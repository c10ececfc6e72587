// SPDX-License-Identifier: Apache-2.0

#include "operation_events.h"

#include <cstdint>

namespace SsoClient::Tool {
namespace {

std::string Milliseconds(std::int64_t microseconds) {
  constexpr std::int64_t MICROSECONDS_PER_MILLISECOND = 1000;
  return std::to_string(microseconds / MICROSECONDS_PER_MILLISECOND) + " ms";
}

std::string OctetsText(std::size_t count) {
  return std::to_string(count) + (count == 1 ? " octet" : " octets");
}

std::string LegText(int leg) {
  return leg > 0 ? ", leg " + std::to_string(leg) : "";
}

class EventLines final : public OperationObserver {
public:
  void OnStarted(const OperationInfo &operation) override { WriteLine(EventText(operation)); }
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &event) override { WriteLine(EventText(event)); }
  void OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &event) override {
    WriteLine(EventText(event));
  }
  void OnFault(const OperationInfo &, const FaultEvent &event) override { WriteLine(EventText(event)); }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &event) override { WriteLine(EventText(event)); }
};

} // namespace

std::string EventText(const OperationInfo &operation) {
  return "started " + operation.name + " " + operation.id;
}

std::string EventText(const RequestSentEvent &event) {
  return "request: " + event.action + ", " + OctetsText(event.requestOctets) + LegText(event.leg);
}

std::string EventText(const ResponseReceivedEvent &event) {
  const std::string end = ", " + Milliseconds(event.durationMicroseconds) + LegText(event.leg);
  if (event.status == 0) {
    return "response: none, " + event.reason + end;
  }
  return "response: " + std::to_string(event.status) + " " + event.reason + ", " +
         (event.contentType.empty() ? "no content type" : event.contentType) + ", " + OctetsText(event.responseOctets) +
         end;
}

std::string EventText(const FaultEvent &event) {
  std::string text = "fault: ";
  if (!event.codeNamespace.empty()) {
    text += "{" + event.codeNamespace + "}" + event.codeName + " (" + event.code + ")";
  } else {
    text += event.code;
  }
  text += ": " + event.text;
  return event.detail.empty() ? text : text + "; detail: " + event.detail;
}

std::string EventText(const OperationEndedEvent &event) {
  const bool hasSucceeded = event.outcome == OperationEndedEvent::Outcome::SUCCEEDED;
  return "ended: " + (hasSucceeded ? "succeeded" : "failed " + event.exceptionClass) + " after " +
         Milliseconds(event.durationMicroseconds);
}

std::shared_ptr<OperationObserver> ObserverFor(const OutputOptions &output) {
  return output.verbose ? std::make_shared<EventLines>() : nullptr;
}

} // namespace SsoClient::Tool
