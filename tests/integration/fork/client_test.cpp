// SPDX-License-Identifier: Apache-2.0
// A client and a token source of the parent process, used by its child while the parent's operations are under way.

#include "integration/fork/held_service.h"
#include "support/forked.h"
#include "support/operation_forms.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <unistd.h>
#include <vector>

namespace SsoClient {
namespace {

using Testing::AllForms;
using Testing::Form;
using Testing::HeldService;
using Testing::RunInChild;
using Testing::Shared;
using Testing::TokenPtr;

constexpr const char *SUBJECT = "{Name: alice; Domain:corp.example}";

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  return spec;
}

Credential PasswordOf(const char *user) {
  return PasswordCredential{user, Tarvel::SecretText("pass")};
}

void ExpectToAcquire(const TokenClient &client) {
  for (const Form form : AllForms()) {
    EXPECT_EQ(Testing::Acquire(form, client, PasswordOf("alice@corp.example"), Spec())->GetSubject().ToString(),
              SUBJECT)
        << NameOf(form);
  }
}

class ClientAfterFork : public testing::TestWithParam<bool> {
protected:
  const HeldService m_server{GetParam()};
  const std::shared_ptr<const TokenClient> m_client = std::make_shared<const TokenClient>(m_server.GetConfig());
};

TEST_P(ClientAfterFork, AcquiresInTheChildOfAParentThatHasAcquired) {
  ExpectToAcquire(*m_client);
  EXPECT_EQ(RunInChild([&] {
              ExpectToAcquire(*m_client);
              ExpectToAcquire(TokenClient(m_server.GetConfig()));
              EXPECT_EQ(RunInChild([&] { ExpectToAcquire(*m_client); }), "") << "a child's child";
            }),
            "");
  ExpectToAcquire(*m_client);
}

TEST_P(ClientAfterFork, RunsNoCallbackOfTheParentInTheChild) {
  const Shared<std::atomic<int>> callsInChildren;
  const pid_t parent = ::getpid();
  Testing::EventCount done;
  constexpr int OPERATIONS = 20;
  const CancelSource cancel;
  CallOptions options = CallOptions::WithTimeout(std::chrono::minutes(3));
  options.cancelToken = cancel.GetToken();
  for (int i = 0; i < OPERATIONS; ++i) {
    m_client->AcquireAsync(PasswordOf("slow@corp.example"), Spec(), options, [&](const TokenOutcome &outcome) {
      EXPECT_TRUE(outcome.HasValue());
      *callsInChildren += ::getpid() == parent ? 0 : 1;
      done.Add();
    });
  }
  std::thread waiting(
      [&] { EXPECT_EQ(m_client->Acquire(PasswordOf("slow@corp.example"), Spec())->GetSubject().ToString(), SUBJECT); });
  ASSERT_TRUE(m_server.WaitForHeld(OPERATIONS + 1));
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(RunInChild([&] { ExpectToAcquire(*m_client); }), "");
  }
  // In the child, the parent's operations do not exist, so there is nothing to cancel.
  EXPECT_EQ(RunInChild([&] {
              cancel.Cancel();
              ExpectToAcquire(*m_client);
            }),
            "");
  const pid_t late = Testing::StartChild([&] {
    // The answers to the parent arrive while this child works.
    m_server.Answer();
    for (int i = 0; i < 5; ++i) {
      ExpectToAcquire(*m_client);
    }
  });
  EXPECT_EQ(Testing::WaitForChild(late), "");
  EXPECT_TRUE(done.WaitFor(OPERATIONS)) << "each of the parent's operations gets its answer";
  waiting.join();
  EXPECT_EQ(*callsInChildren, 0);
}

TEST_P(ClientAfterFork, CanBeDestroyedInTheChildDuringTheParentsOperations) {
  const Shared<std::atomic<int>> calls;
  auto client = std::make_shared<TokenClient>(m_server.GetConfig());
  Testing::EventCount done;
  client->AcquireAsync(PasswordOf("slow@corp.example"), Spec(), {}, [&](const TokenOutcome &outcome) {
    EXPECT_TRUE(outcome.HasValue());
    ++*calls;
    done.Add();
  });
  ASSERT_TRUE(m_server.WaitForHeld(1));
  EXPECT_EQ(RunInChild([&] {
              client.reset();
              ExpectToAcquire(*m_client);
            }),
            "");
  EXPECT_EQ(*calls, 0);
  m_server.Answer();
  EXPECT_TRUE(done.WaitFor(1));
  EXPECT_EQ(*calls, 1);
}

TEST_P(ClientAfterFork, AcquiresInAChildThatACallbackMade) {
  std::string outcome = "never run";
  Testing::EventCount done;
  m_client->AcquireAsync(PasswordOf("alice@corp.example"), Spec(), {}, [&](const TokenOutcome &) {
    outcome = RunInChild([&] { ExpectToAcquire(*m_client); });
    done.Add();
  });
  ASSERT_TRUE(done.WaitFor(1));
  EXPECT_EQ(outcome, "");
  ExpectToAcquire(*m_client);
}

INSTANTIATE_TEST_SUITE_P(Transport, ClientAfterFork, testing::Bool(),
                         [](const auto &isSecure) { return isSecure.param ? "Tls" : "PlainHttp"; });

class TokenSourceAfterFork : public ClientAfterFork {
protected:
  /// A source whose requests are held back in this process, and answered in its children.
  std::unique_ptr<TokenSource> HeldHere() const {
    const pid_t parent = ::getpid();
    return std::make_unique<TokenSource>(
        m_client, [parent] { return PasswordOf(::getpid() == parent ? "slow@corp.example" : "alice@corp.example"); },
        Spec());
  }
};

TEST_P(TokenSourceAfterFork, ReturnsTheParentsTokenInTheChild) {
  const TokenSource source(
      m_client, [] { return PasswordOf("alice@corp.example"); }, Spec());
  const TokenPtr token = source.Get();
  EXPECT_EQ(RunInChild([&] {
              for (const Form form : AllForms()) {
                EXPECT_EQ(Testing::Get(form, source), token) << NameOf(form);
              }
              source.Invalidate(token->GetId());
              EXPECT_THROWS_MESSAGE(source.Get(), SsoException,
                                    "The service issued a token again that was invalidated: " + token->GetId())
                  << "the service has only one token";
            }),
            "");
  EXPECT_EQ(source.Get(), token) << "what the child does changes nothing in the parent";
}

TEST_P(TokenSourceAfterFork, AsksForItselfInTheChildDuringTheParentsRequest) {
  const Shared<std::atomic<int>> callsInChildren;
  const pid_t parent = ::getpid();
  const std::unique_ptr<TokenSource> source = HeldHere();
  Testing::EventCount done;
  for (int i = 0; i < 10; ++i) {
    source->GetAsync({}, [&](const TokenOutcome &outcome) {
      EXPECT_TRUE(outcome.HasValue());
      *callsInChildren += ::getpid() == parent ? 0 : 1;
      done.Add();
    });
  }
  ASSERT_TRUE(m_server.WaitForHeld(1));
  for (const Form form : AllForms()) {
    EXPECT_EQ(RunInChild([&] {
                EXPECT_EQ(Testing::Get(form, *source)->GetSubject().ToString(), SUBJECT);
                EXPECT_TRUE(source->Get());
              }),
              "")
        << NameOf(form);
  }
  m_server.Answer();
  EXPECT_TRUE(done.WaitFor(10));
  EXPECT_EQ(*callsInChildren, 0);
}

INSTANTIATE_TEST_SUITE_P(Transport, TokenSourceAfterFork, testing::Bool(),
                         [](const auto &isSecure) { return isSecure.param ? "Tls" : "PlainHttp"; });

} // namespace
} // namespace SsoClient
