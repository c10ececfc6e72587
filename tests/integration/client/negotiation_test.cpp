// SPDX-License-Identifier: Apache-2.0
// Negotiations of many legs, with a scripted service.
#include "support/data_file.h"
#include "support/operation_forms.h"
#include "support/posting_server.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;

constexpr int LEGS = 12;

std::vector<std::string> AnswersOfManyLegs() {
  std::vector<std::string> answers(LEGS - 1, IntermediateLeg("ctx", "AQID"));
  answers.push_back(FinalLeg("ctx", "BAUG", ReadDataFile("tokens/bearer.xml")));
  return answers;
}

/// Answers each leg of the service, and records the threads on which it runs.
class CountingHandler final : public NegotiationHandler {
public:
  std::shared_ptr<Bytes> NegotiateLeg(const Bytes &serviceLeg) override {
    received.push_back(ToString(serviceLeg));
    threads.insert(std::this_thread::get_id());
    return std::make_shared<Bytes>(3, 'x');
  }

  std::vector<std::string> received;
  std::set<std::thread::id> threads;
};

class NegotiationOfAClient : public testing::TestWithParam<Form> {};

TEST_P(NegotiationOfAClient, RunsEachLegOnAPoolThread) {
  const PostingServer server(AnswersOfManyLegs());
  const TokenClient client(Testing::ConfigFor(server.GetUrl()));
  std::vector<std::shared_ptr<CountingHandler>> handlers;
  const NegotiationCredential credential{[&handlers] {
    handlers.push_back(std::make_shared<CountingHandler>());
    return handlers.back();
  }};
  const TokenPtr token = Testing::Acquire(GetParam(), client, credential, SpecFor(60));
  EXPECT_EQ(token->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  ASSERT_EQ(handlers.size(), 1u);
  std::vector<std::string> expected(LEGS, "\x01\x02\x03");
  expected.front() = "";
  expected.push_back("\x04\x05\x06");
  EXPECT_EQ(handlers[0]->received, expected);
  EXPECT_EQ(handlers[0]->threads.count(std::this_thread::get_id()), 0u);
  EXPECT_EQ(server.GetRequests().size(), static_cast<std::size_t>(LEGS));
}

/// In its third leg, throws an exception that is not one of the library.
class ThrowingHandler final : public NegotiationHandler {
public:
  std::shared_ptr<Bytes> NegotiateLeg(const Bytes &) override {
    if (++m_leg == 3) {
      throw std::out_of_range("no third leg");
    }
    return std::make_shared<Bytes>(3, 'x');
  }

private:
  int m_leg = 0;
};

TEST_P(NegotiationOfAClient, EndsWithWhatTheHandlerThrows) {
  const PostingServer server(AnswersOfManyLegs());
  const TokenClient client(Testing::ConfigFor(server.GetUrl()));
  const NegotiationCredential third{[] { return std::make_shared<ThrowingHandler>(); }};
  EXPECT_THROWS_MESSAGE(Testing::Acquire(GetParam(), client, third, SpecFor(60)), std::out_of_range, "no third leg");
  const NegotiationCredential none{
      []() -> std::shared_ptr<NegotiationHandler> { throw std::domain_error("no handler"); }};
  EXPECT_THROWS_MESSAGE(Testing::Acquire(GetParam(), client, none, SpecFor(60)), std::domain_error, "no handler");
  EXPECT_EQ(server.GetRequests().size(), 2u);
}

/// Waits in its first leg until the test lets it continue.
class BlockedHandler final : public NegotiationHandler {
public:
  explicit BlockedHandler(std::shared_ptr<Gate> gate) : m_gate(std::move(gate)) {}
  std::shared_ptr<Bytes> NegotiateLeg(const Bytes &) override {
    m_gate->Pass();
    return std::make_shared<Bytes>(3, 'x');
  }

private:
  const std::shared_ptr<Gate> m_gate;
};

TEST_P(NegotiationOfAClient, EndsBeforeALegThatCannotBeInterrupted) {
  const PostingServer server({});
  const TokenClient client(Testing::ConfigFor(server.GetUrl()));
  const auto gate = std::make_shared<Gate>();
  const auto made = std::make_shared<std::weak_ptr<NegotiationHandler>>();
  const NegotiationCredential credential{[gate, made]() -> std::shared_ptr<NegotiationHandler> {
    auto handler = std::make_shared<BlockedHandler>(gate);
    *made = handler;
    return handler;
  }};
  const CancelSource cancel;
  CallOptions options;
  options.cancelToken = cancel.GetToken();
  std::thread canceller([&] {
    EXPECT_TRUE(gate->WaitForArrivals(1));
    cancel.Cancel();
  });
  EXPECT_THROWS_MESSAGE(Testing::Acquire(GetParam(), client, credential, SpecFor(60), options), CancelledException,
                        "The operation was cancelled");
  canceller.join();
  gate->Open();
  EXPECT_TRUE(Eventually([&] { return made->expired(); })) << "the leg releases its handler when it ends";
  EXPECT_EQ(server.GetRequests().size(), 0u);
}

INSTANTIATE_TEST_SUITE_P(Forms, NegotiationOfAClient, testing::ValuesIn(AllForms()),
                         [](const auto &form) { return NameOf(form.param); });

} // namespace
} // namespace SsoClient
