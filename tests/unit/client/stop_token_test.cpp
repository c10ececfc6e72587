// SPDX-License-Identifier: Apache-2.0
// Operations that a `std::stop_token` cancels.
#include "client_setup.h"

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <stop_token>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Alice;
using Testing::ClientOn;
using Testing::EndOf;
using Testing::Eventually;
using Testing::Outcomes;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Strings = std::vector<std::string>;

CallOptions With(const std::stop_token &token) {
  CallOptions options;
  options.cancelToken = token;
  return options;
}

TEST(StopToken, CancelsACallback) {
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Hold);
  const auto client = ClientOn(transport);
  std::stop_source source;
  const Outcomes outcomes;
  client->AcquireAsync(Alice(), SpecFor(60), With(source.get_token()), outcomes.Record());
  ASSERT_TRUE(transport->WaitForSent(1));
  EXPECT_EQ(outcomes.Get(), Strings{});
  source.request_stop();
  EXPECT_EQ(outcomes.Wait(), Strings{Testing::CANCELLED});
  EXPECT_TRUE(Eventually([&] { return transport->CountCancelled() == 1; })); // the thread that sends may do it
  EXPECT_TRUE(outcomes.AreReleased());
}

TEST(StopToken, CancelsAFuture) {
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Hold);
  const auto client = ClientOn(transport);
  std::stop_source source;
  auto future = client->ValidateFuture(Testing::HolderToken(), With(source.get_token()));
  ASSERT_TRUE(transport->WaitForSent(1));
  source.request_stop();
  EXPECT_EQ(EndOf([&] { future.get(); }), Testing::CANCELLED);
}

TEST(StopToken, KeepsAnOperationFromStarting) {
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Issue);
  const auto client = ClientOn(transport);
  std::stop_source source;
  source.request_stop();
  EXPECT_EQ(EndOf([&] { client->Acquire(Alice(), SpecFor(60), With(source.get_token())); }), Testing::CANCELLED);
  EXPECT_EQ(transport->Sent(), Strings{});
}

TEST(StopToken, EndsACallThatWaitsWhenItsThreadIsStopped) {
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Hold);
  const auto client = ClientOn(transport);
  std::string end;
  {
    const std::jthread thread([&](const std::stop_token &token) {
      end = EndOf([&] { client->Acquire(Alice(), SpecFor(60), With(token)); });
    });
    EXPECT_TRUE(transport->WaitForSent(1));
  } // requests the stop, and joins the thread
  EXPECT_EQ(end, Testing::CANCELLED);
}

TEST(StopToken, IsNotNeededWhenTheOperationHasEnded) {
  const auto transport = std::make_shared<ScriptedTransport>(Testing::Issue);
  const auto client = ClientOn(transport);
  std::stop_source source;
  EXPECT_NE(client->Acquire(Alice(), SpecFor(60), With(source.get_token())), nullptr);
  source.request_stop();
  EXPECT_EQ(transport->CountCancelled(), 0);
}

} // namespace
} // namespace SsoClient
