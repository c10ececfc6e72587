// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TelemetryObserver`, which turns the events of a service into OpenTelemetry's spans and metrics.

#pragma once

#include "otlp_json.h"

#include <ssoclient/operation_observer.h>

#include <iosfwd>
#include <map>
#include <mutex>
#include <string>

namespace Telemetry {

/// Each operation is a trace. The identifier of the trace is that of the operation without hyphens, so the log lines
/// with this "opId" can be found. The operation is a span of kind INTERNAL. Each exchange with the service is a span of
/// kind CLIENT below it, by the semantic conventions for HTTP. A fault and a failure are events of the operation's
/// span.
///
/// The metrics are the histogram `http.client.request.duration` and the counter `ssoclient.operations`.
///
/// Safe on any thread, like every observer must be. Operations wait for the observer. This one writes short lines to a
/// buffered stream; a program with much traffic would put them into a queue.
class TelemetryObserver final : public SsoClient::OperationObserver {
public:
  /// @param output must outlive the observer
  /// @param url the service's address
  /// @throws Tarvel::Http::MalformedURLException for a malformed address.
  TelemetryObserver(std::ostream &output, std::string serviceName, const std::string &url);

  void OnStarted(const SsoClient::OperationInfo &operation) override;
  void OnRequestSent(const SsoClient::OperationInfo &operation, const SsoClient::RequestSentEvent &event) override;
  void OnResponseReceived(const SsoClient::OperationInfo &operation,
                          const SsoClient::ResponseReceivedEvent &event) override;
  void OnFault(const SsoClient::OperationInfo &operation, const SsoClient::FaultEvent &event) override;
  void OnEnded(const SsoClient::OperationInfo &operation, const SsoClient::OperationEndedEvent &event) override;

  /// Writes the metrics. A program calls it about once a minute, and at its end.
  void WriteMetrics();

private:
  /// The spans of an operation that has not ended.
  struct Trace {
    Span operation;
    std::vector<Span> exchanges;
  };

  Attributes Server() const;

  std::ostream &m_output;
  const std::string m_serviceName;
  const Time m_start;
  std::string m_host;
  int m_port = 0;
  std::string m_path;
  bool m_isSecure = false;

  std::mutex m_mutex; // guards what follows, and the output
  std::map<std::string, Trace> m_traces;
  std::map<Attributes, Histogram> m_durations;
  std::map<Attributes, std::int64_t> m_operations;
};

} // namespace Telemetry
