// SPDX-License-Identifier: Apache-2.0

#include "telemetry_observer.h"

#include <tarvel/http/url.h>

#include <algorithm>
#include <cstdio>
#include <ostream>
#include <random>
#include <utility>

namespace Telemetry {

namespace {

using SsoClient::OperationInfo;
using std::chrono::microseconds;
using std::chrono::system_clock;

constexpr int FIRST_ERROR_STATUS = 400;
constexpr double MICROSECONDS_IN_SECOND = 1e6;

/// A new identifier: 16 hexadecimal digits, not all of them zero.
std::string NewSpanId() {
  static thread_local std::random_device random;
  char digits[17] = "";
  std::snprintf(digits, sizeof digits, "%08x%08x", random() | 1u, random());
  return digits;
}

/// The identifier of the operation's trace: its UUID without hyphens.
std::string TraceIdOf(const OperationInfo &operation) {
  std::string id = operation.id;
  id.erase(std::remove(id.begin(), id.end(), '-'), id.end());
  return id;
}

/// What went wrong in an exchange, with few different values; empty if nothing did.
std::string ErrorTypeOf(const SsoClient::ResponseReceivedEvent &event) {
  if (event.status == 0) {
    return "_OTHER"; // no response
  }
  return event.status < FIRST_ERROR_STATUS ? "" : std::to_string(event.status);
}

} // namespace

TelemetryObserver::TelemetryObserver(std::ostream &output, std::string serviceName, const std::string &url)
    : m_output(output), m_serviceName(std::move(serviceName)), m_start(system_clock::now()) {
  Tarvel::Http::ParseHttpURL(url, m_isSecure, m_host, m_port, m_path);
  m_path.erase(std::min(m_path.find('?'), m_path.size())); // a query may be secret
}

void TelemetryObserver::OnStarted(const OperationInfo &operation) {
  Trace trace;
  trace.operation.traceId = TraceIdOf(operation);
  trace.operation.spanId = NewSpanId();
  trace.operation.name = operation.name;
  trace.operation.start = system_clock::now();
  trace.operation.attributes.Add("ssoclient.operation.name", operation.name);
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_traces[operation.id] = std::move(trace);
}

void TelemetryObserver::OnRequestSent(const OperationInfo &operation, const SsoClient::RequestSentEvent &event) {
  Span span;
  span.spanId = NewSpanId();
  span.name = "POST"; // the semantic conventions' name of a client span without a URL template
  span.kind = SpanKind::CLIENT;
  span.start = system_clock::now();
  span.attributes = Server();
  const std::string host = m_host.find(':') == std::string::npos ? m_host : "[" + m_host + "]"; // IPv6
  span.attributes.Add("url.full", (m_isSecure ? "https://" : "http://") + host + ":" + std::to_string(m_port) + m_path);
  span.attributes.Add("http.request.body.size", static_cast<std::int64_t>(event.requestOctets));
  span.attributes.Add("ssoclient.action", event.action);
  if (event.leg > 0) {
    span.attributes.Add("ssoclient.negotiation.leg", event.leg);
  }
  const std::lock_guard<std::mutex> lock(m_mutex);
  Trace &trace = m_traces.at(operation.id);
  span.traceId = trace.operation.traceId;
  span.parentId = trace.operation.spanId;
  trace.exchanges.push_back(std::move(span));
}

void TelemetryObserver::OnResponseReceived(const OperationInfo &operation,
                                           const SsoClient::ResponseReceivedEvent &event) {
  Attributes dimensions = Server();
  Attributes result;
  if (event.status != 0) {
    dimensions.Add("http.response.status_code", event.status);
    result.Add("http.response.status_code", event.status);
    result.Add("http.response.body.size", static_cast<std::int64_t>(event.responseOctets));
  }
  const std::string errorType = ErrorTypeOf(event);
  if (!errorType.empty()) {
    dimensions.Add("error.type", errorType);
    result.Add("error.type", errorType);
  }
  const std::lock_guard<std::mutex> lock(m_mutex);
  Trace &trace = m_traces.at(operation.id);
  if (trace.exchanges.empty() || trace.exchanges.back().end != system_clock::time_point()) {
    return; // there was no memory for the span of this exchange
  }
  Span &span = trace.exchanges.back();
  span.end = span.start + microseconds(event.durationMicroseconds);
  span.attributes.Append(result);
  span.hasFailed = !errorType.empty();
  span.failure = event.status == 0 ? event.reason : "";
  m_durations[dimensions].Add(static_cast<double>(event.durationMicroseconds) / MICROSECONDS_IN_SECOND);
}

void TelemetryObserver::OnFault(const OperationInfo &operation, const SsoClient::FaultEvent &event) {
  SpanEvent fault{"ssoclient.fault", system_clock::now(), {}};
  fault.attributes.Add("ssoclient.fault.namespace", event.codeNamespace);
  fault.attributes.Add("ssoclient.fault.name", event.codeName);
  fault.attributes.Add("ssoclient.fault.text", event.text);
  fault.attributes.Add("ssoclient.fault.detail", event.detail);
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_traces.at(operation.id).operation.events.push_back(std::move(fault));
}

void TelemetryObserver::OnEnded(const OperationInfo &operation, const SsoClient::OperationEndedEvent &event) {
  Attributes dimensions;
  dimensions.Add("ssoclient.operation.name", operation.name);
  const std::lock_guard<std::mutex> lock(m_mutex);
  auto node = m_traces.extract(operation.id);
  if (node.empty()) {
    return; // there was no memory for the trace
  }
  Trace &trace = node.mapped();
  Span &span = trace.operation;
  span.end = span.start + microseconds(event.durationMicroseconds);
  if (event.outcome == SsoClient::OperationEndedEvent::Outcome::FAILED) {
    SpanEvent exception{"exception", span.end, {}};
    exception.attributes.Add("exception.type", event.exceptionClass);
    exception.attributes.Add("exception.message", event.message);
    span.events.push_back(std::move(exception));
    span.attributes.Add("error.type", event.exceptionClass);
    span.hasFailed = true;
    span.failure = event.message;
    dimensions.Add("error.type", event.exceptionClass);
  }
  ++m_operations[dimensions];
  trace.exchanges.insert(trace.exchanges.begin(), span);
  m_output << WriteSpans(trace.exchanges, m_serviceName);
}

void TelemetryObserver::WriteMetrics() {
  const Time now = system_clock::now();
  const std::lock_guard<std::mutex> lock(m_mutex);
  Metric durations{"http.client.request.duration", "s", MetricKind::HISTOGRAM, {}};
  for (const auto &[dimensions, histogram] : m_durations) {
    durations.points.push_back(histogram.ToJson(dimensions, m_start, now));
  }
  Metric operations{"ssoclient.operations", "{operation}", MetricKind::COUNTER, {}};
  for (const auto &[dimensions, count] : m_operations) {
    operations.points.push_back(ToJson({dimensions, count}, m_start, now));
  }
  m_output << Telemetry::WriteMetrics({durations, operations}, m_serviceName) << std::flush;
}

Attributes TelemetryObserver::Server() const {
  Attributes server;
  server.Add("http.request.method", std::string("POST"));
  server.Add("server.address", m_host);
  server.Add("server.port", m_port);
  return server;
}

} // namespace Telemetry
