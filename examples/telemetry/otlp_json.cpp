// SPDX-License-Identifier: Apache-2.0

#include "otlp_json.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdio>

namespace Telemetry {

namespace {

constexpr int STATUS_ERROR = 2;
constexpr int CUMULATIVE = 2;
constexpr std::array<double, 14> BOUNDS = {0.005, 0.01, 0.025, 0.05, 0.075, 0.1, 0.25, 0.5, 0.75, 1, 2.5, 5, 7.5, 10};

/// The length of the UTF-8 character at `begin`; 0 if the octets there are not UTF-8.
std::size_t Utf8Length(const std::string &text, std::size_t begin) {
  const auto octet = [&](std::size_t i) { return i < text.size() ? static_cast<unsigned char>(text[i]) : 0u; };
  const unsigned lead = octet(begin);
  const std::size_t length = lead < 0x80   ? 1
                             : lead < 0xC2 ? 0
                             : lead < 0xE0 ? 2
                             : lead < 0xF0 ? 3
                             : lead < 0xF5 ? 4
                                           : 0;
  for (std::size_t i = 1; i < length; ++i) {
    if ((octet(begin + i) & 0xC0u) != 0x80u) {
      return 0;
    }
  }
  const unsigned second = octet(begin + 1);
  const bool isOverlong = (lead == 0xE0 && second < 0xA0) || (lead == 0xF0 && second < 0x90);
  const bool isBeyond =
      (lead == 0xED && second > 0x9F) || (lead == 0xF4 && second > 0x8F); // surrogates, above U+10FFFF
  return isOverlong || isBeyond ? 0 : length;
}

/// OTLP/JSON writes a 64-bit integer as a text.
std::string Quoted(std::int64_t value) {
  return '"' + std::to_string(value) + '"';
}

std::string Nanoseconds(Time time) {
  return Quoted(std::chrono::duration_cast<std::chrono::nanoseconds>(time.time_since_epoch()).count());
}

/// A number with a decimal point, in every locale.
std::string Number(double value) {
  const auto micros = static_cast<std::int64_t>(value * 1e6 + 0.5);
  std::string fraction = std::to_string(micros % 1000000);
  fraction.insert(0, 6 - fraction.size(), '0');
  return std::to_string(micros / 1000000) + '.' + fraction;
}

template <typename List, typename ToText>
std::string Array(const List &list, const ToText &toText) {
  std::string all;
  for (const auto &item : list) {
    all += (all.empty() ? "" : ",") + toText(item);
  }
  return '[' + all + ']';
}

std::string EventJson(const SpanEvent &event) {
  return R"({"timeUnixNano":)" + Nanoseconds(event.time) + R"(,"name":)" + JsonText(event.name) + R"(,"attributes":[)" +
         event.attributes.ToJson() + "]}";
}

std::string SpanJson(const Span &span) {
  std::string json = R"({"traceId":)" + JsonText(span.traceId) + R"(,"spanId":)" + JsonText(span.spanId);
  if (!span.parentId.empty()) {
    json += R"(,"parentSpanId":)" + JsonText(span.parentId);
  }
  json += R"(,"name":)" + JsonText(span.name) + R"(,"kind":)" + std::to_string(static_cast<int>(span.kind)) +
          R"(,"startTimeUnixNano":)" + Nanoseconds(span.start) + R"(,"endTimeUnixNano":)" + Nanoseconds(span.end) +
          R"(,"attributes":[)" + span.attributes.ToJson() + R"(],"events":)" + Array(span.events, EventJson);
  if (span.hasFailed) {
    json += R"(,"status":{"code":)" + std::to_string(STATUS_ERROR) + R"(,"message":)" + JsonText(span.failure) + '}';
  }
  return json + '}';
}

std::string MetricJson(const Metric &metric) {
  const bool isCounter = metric.kind == MetricKind::COUNTER;
  return R"({"name":)" + JsonText(metric.name) + R"(,"unit":)" + JsonText(metric.unit) +
         (isCounter ? R"(,"sum":{"isMonotonic":true,)" : R"(,"histogram":{)") + R"("aggregationTemporality":)" +
         std::to_string(CUMULATIVE) + R"(,"dataPoints":)" +
         Array(metric.points, [](const std::string &point) { return point; }) + "}}";
}

/// `content` with the resource that it belongs to and the library that it comes from.
std::string Scoped(const std::string &resources, const std::string &scopes, const std::string &name,
                   const std::string &content, const std::string &serviceName) {
  Attributes resource;
  resource.Add("service.name", serviceName);
  return "{\"" + resources + R"(":[{"resource":{"attributes":[)" + resource.ToJson() + "]},\"" + scopes +
         R"(":[{"scope":{"name":"ssoclient"},")" + name + "\":" + content + "}]}]}\n";
}

std::string PointBegin(const Attributes &attributes, Time start, Time now) {
  return R"({"attributes":[)" + attributes.ToJson() + R"(],"startTimeUnixNano":)" + Nanoseconds(start) +
         R"(,"timeUnixNano":)" + Nanoseconds(now);
}

} // namespace

std::string JsonText(const std::string &text) {
  std::string json = "\"";
  for (std::size_t i = 0; i < text.size();) {
    const std::size_t length = Utf8Length(text, i);
    const char c = text[i];
    if (length == 0) {
      json += "\\ufffd";
    } else if (c == '"' || c == '\\') {
      json += {'\\', c};
    } else if (length == 1 && static_cast<unsigned char>(c) < 0x20) {
      std::array<char, 8> escaped{};
      std::snprintf(escaped.data(), escaped.size(), "\\u%04x", static_cast<unsigned>(c));
      json += escaped.data();
    } else {
      json.append(text, i, length);
    }
    i += std::max<std::size_t>(length, 1);
  }
  return json + '"';
}

void Attributes::Add(const std::string &key, const std::string &value) {
  AddValue(key, "stringValue", JsonText(value));
}

void Attributes::Add(const std::string &key, std::int64_t value) {
  AddValue(key, "intValue", Quoted(value));
}

void Attributes::Append(const Attributes &others) {
  m_list += (m_list.empty() || others.m_list.empty() ? "" : ",") + others.m_list;
}

void Attributes::AddValue(const std::string &key, const std::string &type, const std::string &value) {
  m_list +=
      (m_list.empty() ? R"({"key":)" : R"(,{"key":)") + JsonText(key) + R"(,"value":{")" + type + "\":" + value + "}}";
}

std::string WriteSpans(const std::vector<Span> &spans, const std::string &serviceName) {
  return Scoped("resourceSpans", "scopeSpans", "spans", Array(spans, SpanJson), serviceName);
}

void Histogram::Add(double seconds) {
  m_buckets.resize(BOUNDS.size() + 1);
  // The upper bound of a bucket belongs to it.
  ++m_buckets[static_cast<std::size_t>(std::lower_bound(BOUNDS.begin(), BOUNDS.end(), seconds) - BOUNDS.begin())];
  ++m_count;
  m_sum += seconds;
}

std::string Histogram::ToJson(const Attributes &attributes, Time start, Time now) const {
  return PointBegin(attributes, start, now) + R"(,"count":)" + Quoted(m_count) + R"(,"sum":)" + Number(m_sum) +
         R"(,"bucketCounts":)" + Array(m_buckets, Quoted) + R"(,"explicitBounds":)" + Array(BOUNDS, Number) + '}';
}

std::string ToJson(const CounterPoint &point, Time start, Time now) {
  return PointBegin(point.attributes, start, now) + R"(,"asInt":)" + Quoted(point.value) + '}';
}

std::string WriteMetrics(const std::vector<Metric> &metrics, const std::string &serviceName) {
  return Scoped("resourceMetrics", "scopeMetrics", "metrics", Array(metrics, MetricJson), serviceName);
}

} // namespace Telemetry
