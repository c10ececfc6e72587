// SPDX-License-Identifier: Apache-2.0
// A thousand asynchronous operations at once over TLS, against a service that stalls before it answers.
#include "integration/service_load/canned_service.h"
#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"

#include <ssoclient/exceptions.h>
#include <tarvel/system/thread_pool.h>

#include <boost/optional.hpp>

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using Testing::CannedService;
using TokenPtr = std::shared_ptr<const SamlToken>;

constexpr int OPERATIONS = 1000;

/// The results of the operations, by their numbers.
class Outcomes {
public:
  SecurityTokenService::TokenCompletion ForToken(int number) const {
    return [state = m_state, number](const TokenPtr &token, const Tarvel::Exception *failure) {
      state->Note(number, failure ? failure->what() : token ? token->GetSubject().ToString() : "null");
    };
  }
  SecurityTokenService::ValidityCompletion ForValidity(int number) const {
    return [state = m_state, number](const boost::optional<bool> &valid, const Tarvel::Exception *failure) {
      state->Note(number, failure ? failure->what() : valid && *valid ? "valid" : "not valid");
    };
  }

  bool WaitForAll() const { return m_state->called.WaitFor(OPERATIONS); }
  int CountCalls() const { return m_state->called.Get(); }

  /// All results of operation `number`.
  std::string Get(int number) const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->results[static_cast<std::size_t>(number)];
  }

  int CountCallsOn(std::thread::id thread) const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return static_cast<int>(std::count(m_state->threads.begin(), m_state->threads.end(), thread));
  }

private:
  struct State {
    void Note(int number, const std::string &result) {
      {
        const std::lock_guard<std::mutex> lock(mutex);
        results[static_cast<std::size_t>(number)] += result;
        threads.push_back(std::this_thread::get_id());
      }
      called.Add();
      if (number % 10 == 9) {
        throw SsoException("thrown by the completion");
      }
    }

    std::mutex mutex;
    std::vector<std::string> results{OPERATIONS};
    std::vector<std::thread::id> threads;
    Testing::EventCount called;
  };

  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  return spec;
}

void Start(const SecurityTokenService &service, const TokenPtr &held, int number, const Outcomes &outcomes) {
  switch (number % 5) {
  case 0:
    return service.AcquireTokenAsync("alice@corp.example", "pass", Spec(), outcomes.ForToken(number));
  case 1:
    return service.AcquireTokenByCertificateAsync(Spec(), outcomes.ForToken(number));
  case 2:
    return service.AcquireTokenByTokenAsync(held, Spec(), outcomes.ForToken(number));
  case 3:
    return service.ValidateSubjectAsync(held, outcomes.ForValidity(number));
  default:
    return service.RenewTokenAsync(held, 60, outcomes.ForToken(number));
  }
}

TEST(AThousandAsyncOperationsOverTls, CompleteOnceEachWhenTheServiceStallsAndEverythingIsReleased) {
  const Testing::RecordedLog log;
  const Testing::ScopedLogLevel level(63);
  const auto gate = std::make_shared<Testing::Gate>();
  const CannedService server([gate] { gate->Pass(); });
  const Outcomes outcomes;
  std::weak_ptr<const SamlToken> watchedToken;
  {
    const SecurityTokenServiceConfig config = server.GetConfig();
    const std::shared_ptr<const SecurityTokenService> service = CreateSecurityTokenService(config);
    const TokenPtr held = Testing::HeldToken();
    watchedToken = held;
    for (int i = 0; i < OPERATIONS; ++i) {
      Start(*service, held, i, outcomes);
    }
  } // service, token and configuration are destroyed

  // The pool has no more threads than this; the others wait in its queue.
  ASSERT_TRUE(gate->WaitForArrivals(Tarvel::System::DEFAULT_THREAD_CEILING));
  EXPECT_EQ(outcomes.CountCalls(), 0);
  EXPECT_FALSE(watchedToken.expired());
  gate->Open();

  ASSERT_TRUE(outcomes.WaitForAll());
  EXPECT_TRUE(Testing::Eventually([&] { return watchedToken.expired(); }));
  for (int i = 0; i < OPERATIONS; ++i) {
    EXPECT_EQ(outcomes.Get(i), i % 5 == 3 ? "valid" : "{Name: alice; Domain:corp.example}") << "operation " << i;
  }
  EXPECT_EQ(outcomes.CountCallsOn(std::this_thread::get_id()), 0);
  EXPECT_EQ(outcomes.CountCalls(), OPERATIONS);
  EXPECT_EQ(server.CountConnections(), OPERATIONS);
  EXPECT_TRUE(Testing::Eventually([&] { return server.CountOpenConnections() == 0; }));
  // An exception from a completion ends only its work item.
  ASSERT_TRUE(log.WaitForLines(OPERATIONS / 10));
  EXPECT_EQ(log.Lines(),
            std::vector<std::string>(OPERATIONS / 10, "Tarvel 8 An exception left a work item of the thread pool: "
                                                      "SsoClient::SsoException: thrown by the completion"));
}

} // namespace
} // namespace SsoClient
