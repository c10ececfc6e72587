// SPDX-License-Identifier: Apache-2.0
// A service of the parent process, used by its child while the parent's operations are under way.

#include "integration/fork/held_service.h"
#include "support/data_file.h"
#include "support/forked.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"

#include <ssoclient/connection_spec.h>
#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/http/user_agent.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <unistd.h>

namespace SsoClient {
namespace {

using Tarvel::Exception;
using Tarvel::Ref;
using Testing::HeldService;
using Testing::RunInChild;
using Testing::Shared;
using TokenPtr = std::shared_ptr<const SamlToken>;

constexpr const char *SUBJECT = "{Name: alice; Domain:corp.example}";

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  return spec;
}

std::string Acquire(const SecurityTokenService &service, const std::string &user = "alice@corp.example") {
  return service.AcquireToken(user, "pass", Spec())->GetSubject().ToString();
}

/// The outcome of one asynchronous operation.
class Outcome {
public:
  SecurityTokenService::TokenCompletion ForToken() const {
    return [state = m_state](const TokenPtr &token, const Exception *failure) {
      state->text = failure ? failure->what() : token->GetSubject().ToString();
      state->called.Add();
    };
  }
  std::string Get() const { return m_state->called.WaitFor(1) ? m_state->text : "(never called)"; }

private:
  struct State {
    std::string text;
    Testing::EventCount called;
  };
  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

std::string AcquireAsync(const SecurityTokenService &service) {
  const Outcome outcome;
  service.AcquireTokenAsync("alice@corp.example", "pass", Spec(), outcome.ForToken());
  return outcome.Get();
}

class ServiceAfterFork : public testing::TestWithParam<bool> {
protected:
  const HeldService m_server{GetParam()};
  const SecurityTokenServiceConfig m_config = m_server.GetConfig();
  const std::shared_ptr<const SecurityTokenService> m_service = CreateSecurityTokenService(m_config);
};

TEST_P(ServiceAfterFork, AcquiresInTheChildOfAParentThatHasAcquired) {
  ASSERT_EQ(Acquire(*m_service), SUBJECT);
  ASSERT_EQ(AcquireAsync(*m_service), SUBJECT);
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(Acquire(*m_service), SUBJECT);
              EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
              EXPECT_EQ(Acquire(*CreateSecurityTokenService(m_config)), SUBJECT);
              EXPECT_EQ(RunInChild([&] { EXPECT_EQ(AcquireAsync(*m_service), SUBJECT); }), "") << "a child's child";
            }),
            "");
  EXPECT_EQ(Acquire(*m_service), SUBJECT);
  EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
}

TEST_P(ServiceAfterFork, AcquiresInTheChildDuringTheParentsOperationsWithoutTheirCompletions) {
  const Shared<std::atomic<int>> callsInChildren;
  const pid_t parent = ::getpid();
  Testing::EventCount done;
  constexpr int OPERATIONS = 20;
  for (int i = 0; i < OPERATIONS; ++i) {
    m_service->AcquireTokenAsync("slow@corp.example", "pass", Spec(), [&](const TokenPtr &token, const Exception *) {
      EXPECT_TRUE(token);
      *callsInChildren += ::getpid() == parent ? 0 : 1;
      done.Add();
    });
  }
  std::thread waiting([&] { EXPECT_EQ(Acquire(*m_service, "slow@corp.example"), SUBJECT); });
  ASSERT_TRUE(m_server.WaitForHeld(OPERATIONS + 1));
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(RunInChild([&] {
                EXPECT_EQ(Acquire(*m_service), SUBJECT);
                EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
              }),
              "");
  }
  const pid_t late = Testing::StartChild([&] {
    // The answers to the parent arrive while this child works.
    m_server.Answer();
    for (int i = 0; i < 10; ++i) {
      EXPECT_EQ(Acquire(*m_service), SUBJECT);
    }
  });
  EXPECT_EQ(Testing::WaitForChild(late), "");
  EXPECT_TRUE(done.WaitFor(OPERATIONS)) << "each of the parent's operations gets its answer";
  waiting.join();
  EXPECT_EQ(*callsInChildren, 0);
}

TEST_P(ServiceAfterFork, AcquiresInAChildThatACompletionMade) {
  std::string outcome = "never run";
  Testing::EventCount done;
  m_service->AcquireTokenAsync("alice@corp.example", "pass", Spec(), [&](const TokenPtr &, const Exception *) {
    outcome = RunInChild([&] {
      EXPECT_EQ(Acquire(*m_service), SUBJECT);
      EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
    });
    done.Add();
  });
  ASSERT_TRUE(done.WaitFor(1));
  EXPECT_EQ(outcome, "");
  EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
}

/// Forks in its first leg. The child continues the acquisition that its parent began.
class ForkingHandler final : public NegotiationHandler {
public:
  explicit ForkingHandler(pid_t &child) : m_child(child) {}
  std::shared_ptr<std::vector<std::uint8_t>> NegotiateLeg(const std::vector<std::uint8_t> &) override {
    m_child = ::fork();
    return std::make_shared<std::vector<std::uint8_t>>(3, 'x');
  }

private:
  pid_t &m_child;
};

// The service's answer is not a leg. Each process reports that once its request has been answered.
TEST_P(ServiceAfterFork, ContinuesInBothProcessesWhenTheHandlerForks) {
  pid_t child = -1;
  ForkingHandler handler(child);
  const testing::AssertionResult refused = Testing::ThrowsMessage<SsoException>(
      [&] { m_service->AcquireTokenByGSS(Spec(), handler); }, "Unexpected XML format");
  if (child == 0) {
    ::_exit(refused ? 0 : 1);
  }
  ASSERT_GT(child, 0);
  EXPECT_TRUE(refused);
  EXPECT_EQ(Testing::WaitForChild(child), "");
}

TEST_P(ServiceAfterFork, VerifiesAndAcquiresInEachChildOfABusyParent) {
  if (!Testing::MAY_FORK_WHILE_OTHERS_ALLOCATE) {
    GTEST_SKIP() << "the sanitizer's allocator may stay locked in the child";
  }
  const std::string xml = Testing::ReadDataFile("tokens/bearer.xml");
  std::atomic<bool> stop{false};
  const auto work = [&] {
    while (!stop) {
      EXPECT_EQ(Acquire(*m_service), SUBJECT);
      EXPECT_EQ(CreateSamlToken(xml, m_config.signingCertificates)->GetSubject().ToString(), SUBJECT);
      EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
    }
  };
  std::thread first(work);
  std::thread second(work);
  for (int i = 0; i < 20; ++i) {
    EXPECT_EQ(RunInChild([&] {
                EXPECT_EQ(CreateSamlToken(xml, m_config.signingCertificates)->GetSubject().ToString(), SUBJECT);
                EXPECT_EQ(Acquire(*m_service), SUBJECT);
                EXPECT_EQ(AcquireAsync(*m_service), SUBJECT);
              }),
              "")
        << i;
  }
  stop = true;
  first.join();
  second.join();
}

INSTANTIATE_TEST_SUITE_P(Transport, ServiceAfterFork, testing::Bool(),
                         [](const auto &isSecure) { return isSecure.param ? "Tls" : "PlainHttp"; });

/// Starts a request that `server` does not answer yet.
Ref<Tarvel::Http::PendingRequestItem> StartSlowRequest(const HeldService &server,
                                                       const Ref<Tarvel::Http::UserAgent> &agent,
                                                       const Shared<std::atomic<int>> &calls) {
  const Ref<Tarvel::Http::ClientRequest> request = Tarvel::Http::CreateHttpRequest("POST", "/sts");
  request->WriteBody("slow@corp.example");
  Ref<Tarvel::Http::PendingRequestItem> pending;
  agent->StartRequest(
      request,
      [&calls](const Exception *, const Ref<Tarvel::Http::ClientResponse> &,
               const Ref<Tarvel::Http::PendingRequestItem> &) { ++*calls; },
      pending);
  EXPECT_TRUE(server.WaitForHeld(1));
  return pending;
}

TEST(RequestAfterFork, EndsAWaitInTheChildAtOnce) {
  const HeldService server(false);
  const Shared<std::atomic<int>> calls;
  Ref<Tarvel::Http::ConnectionSpec> spec;
  CreateSsoConnectionSpec("localhost", server.GetPort(), false, spec);
  const auto agent = Tarvel::Http::CreateHttpUserAgent(spec, Tarvel::Http::CreateCookieStore());
  const Ref<Tarvel::Http::PendingRequestItem> pending = StartSlowRequest(server, agent, calls);
  Ref<Tarvel::Http::ClientResponse> response;
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(pending->IsDone());
              pending->Cancel();
              EXPECT_TRUE(Testing::ThrowsMessage<Tarvel::System::NetworkException>(
                  [&] { agent->WaitForRequest(pending, std::int64_t{240} * 1000000, response); },
                  "The request to localhost:" + std::to_string(server.GetPort()) +
                      " was under way when the process forked: its parent goes on with it"));
            }),
            "");
  EXPECT_EQ(*calls, 0);
  EXPECT_FALSE(pending->IsDone());
  server.Answer();
  agent->WaitForRequest(pending, std::int64_t{60} * 1000000, response);
  EXPECT_EQ(response->GetStatusCode(), 200);
  EXPECT_EQ(*calls, 1);
  EXPECT_EQ(RunInChild([&] {
              Ref<Tarvel::Http::ClientResponse> known;
              agent->WaitForRequest(pending, 0, known);
              EXPECT_EQ(known->GetStatusCode(), 200);
            }),
            "")
      << "a request that was done before the fork";
}

} // namespace
} // namespace SsoClient
