// SPDX-License-Identifier: Apache-2.0
// The spans and metrics that the example writes, read by a JSON library.
#include "telemetry_observer.h"

#include "support/throws_message.h"

#include <tarvel/http/url.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <chrono>
#include <cstdint>
#include <map>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

namespace Telemetry {
namespace {

using nlohmann::json;

const SsoClient::OperationInfo OPERATION = {"0a1b2c3d-0000-4000-8000-00000000000f", "AcquireToken"};

/// The values of the attributes as text, by name.
std::map<std::string, std::string> AttributesOf(const json &object) {
  std::map<std::string, std::string> attributes;
  for (const json &attribute : object.at("attributes")) {
    attributes[attribute.at("key")] = attribute.at("value").begin()->get<std::string>();
  }
  return attributes;
}

std::int64_t TimeOf(const json &object, const char *name) {
  return std::stoll(object.at(name).get<std::string>());
}

class TelemetryObserverTest : public testing::Test {
protected:
  /// The events of an operation with one exchange.
  void Exchange(const SsoClient::ResponseReceivedEvent &received) {
    m_observer.OnStarted(OPERATION);
    m_observer.OnRequestSent(OPERATION, {"urn:action", 100, 0});
    m_observer.OnResponseReceived(OPERATION, received);
  }

  void End(const std::string &exceptionClass = "", const std::string &message = "") {
    using Event = SsoClient::OperationEndedEvent;
    const Event::Outcome outcome = exceptionClass.empty() ? Event::Outcome::SUCCEEDED : Event::Outcome::FAILED;
    m_observer.OnEnded(OPERATION, {outcome, exceptionClass, message, 2000});
  }

  std::vector<json> Lines() const {
    std::vector<json> lines;
    std::istringstream text(m_output.str());
    for (std::string line; std::getline(text, line);) {
      lines.push_back(json::parse(line));
    }
    return lines;
  }

  json Spans() const { return Lines().at(0).at("resourceSpans").at(0).at("scopeSpans").at(0).at("spans"); }

  json Metrics() {
    m_observer.WriteMetrics();
    return Lines().back().at("resourceMetrics").at(0).at("scopeMetrics").at(0).at("metrics");
  }

  std::ostringstream m_output;
  TelemetryObserver m_observer{m_output, "tests", "https://sts.example:8443/trust?key=1"};
};

TEST_F(TelemetryObserverTest, WritesTheOperationAndItsExchangeAsSpansOfOneTrace) {
  Exchange({200, "OK", "text/xml", 5000, 1500, 0});
  End();
  const json spans = Spans();
  ASSERT_EQ(spans.size(), 2u);
  const json &operation = spans[0];
  const json &exchange = spans[1];
  EXPECT_EQ(operation.at("traceId"), "0a1b2c3d00004000800000000000000f");
  EXPECT_EQ(exchange.at("traceId"), operation.at("traceId"));
  EXPECT_EQ(operation.at("spanId").get<std::string>().size(), 16u);
  EXPECT_EQ(exchange.at("parentSpanId"), operation.at("spanId"));
  EXPECT_NE(exchange.at("spanId"), operation.at("spanId"));
  EXPECT_FALSE(operation.contains("parentSpanId"));
  EXPECT_EQ(operation.at("name"), "AcquireToken");
  EXPECT_EQ(operation.at("kind"), 1);
  EXPECT_EQ(exchange.at("name"), "POST");
  EXPECT_EQ(exchange.at("kind"), 3);
  EXPECT_EQ(TimeOf(operation, "endTimeUnixNano") - TimeOf(operation, "startTimeUnixNano"), 2000000);
  EXPECT_EQ(TimeOf(exchange, "endTimeUnixNano") - TimeOf(exchange, "startTimeUnixNano"), 1500000);
  EXPECT_EQ(AttributesOf(exchange), (std::map<std::string, std::string>{{"http.request.method", "POST"},
                                                                        {"server.address", "sts.example"},
                                                                        {"server.port", "8443"},
                                                                        {"url.full", "https://sts.example:8443/trust"},
                                                                        {"http.request.body.size", "100"},
                                                                        {"ssoclient.action", "urn:action"},
                                                                        {"http.response.status_code", "200"},
                                                                        {"http.response.body.size", "5000"}}));
  EXPECT_FALSE(operation.contains("status"));
  EXPECT_FALSE(exchange.contains("status"));
  EXPECT_EQ(AttributesOf(Lines()[0].at("resourceSpans")[0].at("resource")),
            (std::map<std::string, std::string>{{"service.name", "tests"}}));
}

TEST_F(TelemetryObserverTest, WritesAFaultAndAFailureAsEvents) {
  Exchange({500, "Internal Server Error", "text/xml", 300, 1500, 0});
  m_observer.OnFault(OPERATION, {"urn:wst", "FailedAuthentication", "w:FailedAuthentication", "who?", "a\"b\\c\nd"});
  End("InvalidCredentialsException", "Authentication failed: who?");
  const json spans = Spans();
  const json &events = spans[0].at("events");
  ASSERT_EQ(events.size(), 2u);
  EXPECT_EQ(events[0].at("name"), "ssoclient.fault");
  EXPECT_EQ(AttributesOf(events[0]),
            (std::map<std::string, std::string>{{"ssoclient.fault.namespace", "urn:wst"},
                                                {"ssoclient.fault.name", "FailedAuthentication"},
                                                {"ssoclient.fault.text", "who?"},
                                                {"ssoclient.fault.detail", "a\"b\\c\nd"}}));
  EXPECT_EQ(events[1].at("name"), "exception");
  EXPECT_EQ(AttributesOf(events[1]),
            (std::map<std::string, std::string>{{"exception.type", "InvalidCredentialsException"},
                                                {"exception.message", "Authentication failed: who?"}}));
  EXPECT_EQ(AttributesOf(spans[0]).at("error.type"), "InvalidCredentialsException");
  EXPECT_EQ(spans[0].at("status"), (json{{"code", 2}, {"message", "Authentication failed: who?"}}));
  EXPECT_EQ(AttributesOf(spans[1]).at("error.type"), "500");
  EXPECT_EQ(spans[1].at("status").at("code"), 2);
}

TEST_F(TelemetryObserverTest, WritesAnExchangeWithoutResponse) {
  Exchange({0, "connection refused", "", 0, 1500, 0});
  End("CommunicationException", "connection refused");
  const json exchange = Spans()[1];
  const auto attributes = AttributesOf(exchange);
  EXPECT_EQ(attributes.at("error.type"), "_OTHER");
  EXPECT_EQ(attributes.count("http.response.status_code"), 0u);
  EXPECT_EQ(exchange.at("status").at("message"), "connection refused");
}

TEST_F(TelemetryObserverTest, CountsOperationsAndDurationsByOutcome) {
  for (const std::int64_t microseconds : {5000, 5001, 20000000}) {
    Exchange({200, "OK", "text/xml", 1, microseconds, 0});
    End();
  }
  Exchange({503, "Busy", "text/html", 0, 1000, 0});
  End("CommunicationException", "busy");
  const json metrics = Metrics();
  ASSERT_EQ(metrics.size(), 2u);
  EXPECT_EQ(metrics[0].at("name"), "http.client.request.duration");
  EXPECT_EQ(metrics[0].at("unit"), "s");
  EXPECT_EQ(metrics[0].at("histogram").at("aggregationTemporality"), 2);
  const json &points = metrics[0].at("histogram").at("dataPoints");
  ASSERT_EQ(points.size(), 2u);
  EXPECT_EQ(AttributesOf(points[0]).at("http.response.status_code"), "200");
  EXPECT_EQ(points[0].at("count"), "3");
  EXPECT_EQ(points[0].at("sum"), 20.010001);
  EXPECT_EQ(points[0].at("bucketCounts"),
            (json{"1", "1", "0", "0", "0", "0", "0", "0", "0", "0", "0", "0", "0", "0", "1"}));
  EXPECT_EQ(points[0].at("explicitBounds").size(), 14u);
  EXPECT_EQ(AttributesOf(points[1]).at("error.type"), "503");
  EXPECT_EQ(metrics[1].at("name"), "ssoclient.operations");
  const json &counts = metrics[1].at("sum").at("dataPoints");
  EXPECT_TRUE(metrics[1].at("sum").at("isMonotonic"));
  ASSERT_EQ(counts.size(), 2u);
  EXPECT_EQ(counts[0].at("asInt"), "3");
  EXPECT_EQ(AttributesOf(counts[1]).at("error.type"), "CommunicationException");
  EXPECT_EQ(counts[1].at("asInt"), "1");
}

TEST_F(TelemetryObserverTest, WritesTextThatIsNotUtf8AsReplacementCharacters) {
  Exchange({0, "a\xFF\xC3(\xED\xA0\x80\xF0\x80\x80\x80\xC3\xBC\xE2\x82\xAC\xF0\x9F\x98\x80\xE2\x82", "", 0, 1, 0});
  End();
  EXPECT_EQ(Spans()[1].at("status").at("message"),
            "a\xEF\xBF\xBD\xEF\xBF\xBD(\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF"
            "\xBD\xC3\xBC\xE2\x82\xAC\xF0\x9F\x98\x80\xEF\xBF\xBD\xEF\xBF\xBD");
}

TEST_F(TelemetryObserverTest, WritesWholeLinesWhenOperationsRunAtOnce) {
  constexpr int THREADS = 8;
  constexpr int ROUNDS = 50;
  std::vector<std::thread> threads;
  for (int thread = 0; thread < THREADS; ++thread) {
    threads.emplace_back([this, thread] {
      for (int round = 0; round < ROUNDS; ++round) {
        const SsoClient::OperationInfo operation = {std::to_string(thread * ROUNDS + round), "RenewToken"};
        m_observer.OnStarted(operation);
        m_observer.OnRequestSent(operation, {"urn:action", 1, 0});
        m_observer.OnResponseReceived(operation, {200, "OK", "text/xml", 1, 1, 0});
        m_observer.OnEnded(operation, {});
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(Metrics()[1].at("sum").at("dataPoints")[0].at("asInt"), std::to_string(THREADS * ROUNDS));
  EXPECT_EQ(Lines().size(), THREADS * ROUNDS + 1u);
}

TEST(TelemetryObserver, RefusesAMalformedAddress) {
  std::ostringstream output;
  EXPECT_THROW(TelemetryObserver(output, "tests", "sts.example"), Tarvel::Http::MalformedURLException);
}

} // namespace
} // namespace Telemetry
