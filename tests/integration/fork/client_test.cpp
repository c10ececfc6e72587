// SPDX-License-Identifier: Apache-2.0
// A client of the parent process, used by its child while the parent's operations are under way.

#include "integration/fork/held_service.h"
#include "support/forked.h"
#include "support/rendezvous.h"
#include "support/service_stand_ins.h"

#include <ssoclient/client/token_client.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <unistd.h>

namespace SsoClient {
namespace {

using Testing::HeldService;
using Testing::RunInChild;
using Testing::Shared;

constexpr const char *SUBJECT = "{Name: alice; Domain:corp.example}";

PasswordCredential User(const std::string &name) {
  return {name + "@corp.example", Tarvel::SecretText("pass")};
}

std::string Acquire(const TokenClient &client, const std::string &user = "alice") {
  return client.Acquire(User(user), Testing::SpecFor(60))->GetSubject().ToString();
}

std::string AcquireFuture(const TokenClient &client) {
  const auto options = CallOptions::WithTimeout(std::chrono::minutes(1));
  return client.AcquireFuture(User("alice"), Testing::SpecFor(60), options).get()->GetSubject().ToString();
}

class ClientAfterFork : public testing::TestWithParam<bool> {
protected:
  const HeldService m_server{GetParam()};
  std::unique_ptr<TokenClient> m_client = std::make_unique<TokenClient>(m_server.GetConfig());
};

TEST_P(ClientAfterFork, AcquiresInTheChildDuringTheParentsOperationsWithoutTheirCallbacks) {
  const Shared<std::atomic<int>> callsInChildren;
  const pid_t parent = ::getpid();
  Testing::EventCount done;
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  options.deadline = CallOptions::Clock::now() + std::chrono::minutes(3);
  constexpr int OPERATIONS = 20;
  for (int i = 0; i < OPERATIONS; ++i) {
    m_client->AcquireAsync(User("slow"), Testing::SpecFor(60), options, [&](const TokenOutcome &outcome) {
      EXPECT_TRUE(outcome.HasValue());
      *callsInChildren += ::getpid() == parent ? 0 : 1;
      done.Add();
    });
  }
  std::thread waiting([&] { EXPECT_EQ(Acquire(*m_client, "slow"), SUBJECT); });
  ASSERT_TRUE(m_server.WaitForHeld(OPERATIONS + 1));
  EXPECT_EQ(RunInChild([&] {
              source.Cancel(); // the parent's operations do not exist here
              EXPECT_EQ(Acquire(*m_client), SUBJECT);
              EXPECT_EQ(AcquireFuture(*m_client), SUBJECT);
              EXPECT_EQ(RunInChild([&] { EXPECT_EQ(AcquireFuture(*m_client), SUBJECT); }), "") << "a child's child";
              m_client = nullptr;
            }),
            "");
  EXPECT_EQ(RunInChild([&] {
              m_client = nullptr; // without any other use
            }),
            "");
  m_server.Answer();
  EXPECT_TRUE(done.WaitFor(OPERATIONS)) << "each of the parent's operations gets its answer";
  waiting.join();
  EXPECT_EQ(*callsInChildren, 0);
}

TEST_P(ClientAfterFork, AcquiresInAChildThatACallbackMade) {
  std::string outcome = "never run";
  Testing::EventCount done;
  m_client->AcquireAsync(User("alice"), Testing::SpecFor(60), {}, [&](const TokenOutcome &) {
    outcome = RunInChild([&] {
      EXPECT_EQ(Acquire(*m_client), SUBJECT);
      EXPECT_EQ(AcquireFuture(*m_client), SUBJECT);
    });
    done.Add();
  });
  ASSERT_TRUE(done.WaitFor(1));
  EXPECT_EQ(outcome, "");
  EXPECT_EQ(Acquire(*m_client), SUBJECT);
}

/// Forks when a request is about to be sent. The operation goes on in the parent only.
class ForkingObserver final : public OperationObserver {
public:
  explicit ForkingObserver(pid_t &child) : m_child(child) {}
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { m_child = ::fork(); }

private:
  pid_t &m_child;
};

TEST_P(ClientAfterFork, EndsACallThatWaitsInTheChildThatItsObserverMade) {
  pid_t child = -1;
  CallOptions options;
  options.observer = std::make_shared<ForkingObserver>(child);
  std::string end;
  try {
    end = m_client->Acquire(User("alice"), Testing::SpecFor(60), options)->GetSubject().ToString();
  } catch (const CommunicationException &failure) {
    end = failure.what();
  }
  if (child == 0) {
    ::_exit(end == "The operation was under way when the process forked: its parent goes on with it" ? 0 : 1);
  }
  ASSERT_GT(child, 0);
  EXPECT_EQ(end, SUBJECT);
  EXPECT_EQ(Testing::WaitForChild(child), "");
}

INSTANTIATE_TEST_SUITE_P(Transport, ClientAfterFork, testing::Bool(),
                         [](const auto &isSecure) { return isSecure.param ? "Tls" : "PlainHttp"; });

} // namespace
} // namespace SsoClient
