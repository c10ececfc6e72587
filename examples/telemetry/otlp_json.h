// SPDX-License-Identifier: Apache-2.0
/// @file
/// Spans and metrics in OTLP/JSON, the form in which an OpenTelemetry collector reads files: one request on each line.

#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

namespace Telemetry {

using Time = std::chrono::system_clock::time_point;

/// `text` in quotes, with everything escaped that JSON does not allow. Octets that are not UTF-8 become U+FFFD.
std::string JsonText(const std::string &text);

/// A list of attributes. Two lists with the same attributes in the same order are equal.
class Attributes {
public:
  void Add(const std::string &key, const std::string &value);
  void Add(const std::string &key, std::int64_t value);
  void Append(const Attributes &others);

  const std::string &ToJson() const { return m_list; }
  bool operator<(const Attributes &other) const { return m_list < other.m_list; }

private:
  void AddValue(const std::string &key, const std::string &type, const std::string &value);

  std::string m_list; // without brackets
};

/// Something that happened during a span.
struct SpanEvent {
  std::string name;
  Time time;
  Attributes attributes;
};

/// The kinds of spans that are used here, with their numbers in OTLP.
enum class SpanKind { INTERNAL = 1, CLIENT = 3 };

struct Span {
  std::string traceId;  // 32 hexadecimal digits
  std::string spanId;   // 16 hexadecimal digits
  std::string parentId; // empty for the root
  std::string name;
  SpanKind kind = SpanKind::INTERNAL;
  Time start;
  Time end;
  Attributes attributes;
  std::vector<SpanEvent> events;
  bool hasFailed = false;
  std::string failure; // why it failed; may be empty
};

/// A line with these spans.
std::string WriteSpans(const std::vector<Span> &spans, const std::string &serviceName);

/// A sum that only grows.
struct CounterPoint {
  Attributes attributes;
  std::int64_t value = 0;
};

/// A histogram of seconds, with the buckets that the semantic conventions recommend.
class Histogram {
public:
  void Add(double seconds);
  /// The data point, from `start` to `now`.
  std::string ToJson(const Attributes &attributes, Time start, Time now) const;

private:
  std::vector<std::int64_t> m_buckets;
  std::int64_t m_count = 0;
  double m_sum = 0;
};

/// A point of a counter, from `start` to `now`.
std::string ToJson(const CounterPoint &point, Time start, Time now);

enum class MetricKind { COUNTER, HISTOGRAM };

/// A metric with its data points, which are JSON.
struct Metric {
  std::string name;
  std::string unit;
  MetricKind kind = MetricKind::COUNTER;
  std::vector<std::string> points;
};

/// A line with these metrics. Their points contain everything since the start (cumulative temporality).
std::string WriteMetrics(const std::vector<Metric> &metrics, const std::string &serviceName);

} // namespace Telemetry
