// SPDX-License-Identifier: Apache-2.0
// Operations over TLS that are cancelled at random moments, by a request to stop a thread, and by the end of their
// client.
#include "integration/service/service_client.h"
#include "support/operation_forms.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/sanitized.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <exception>
#include <future>
#include <map>
#include <memory>
#include <mutex>
#include <random>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;

/// Four threads compute, and two do the input and output. Each look-up of a name has a thread too, which ends soon after
/// the look-up does. On a busy machine there can be several of them for a moment.
constexpr std::size_t COMPUTING_AND_IO_THREADS = 6;

const Credential ALICES = PasswordCredential{ALICE, Tarvel::SecretText(PASSWORD)};

/// Counts the outcomes of operations by their texts, "" for a success. Callbacks may outlive the test's own objects.
class Outcomes {
public:
  TokenCallback ForNext() const {
    const auto calls = std::make_shared<std::atomic<int>>(0);
    return [state = m_state, calls](const TokenOutcome &outcome) {
      EXPECT_EQ(++*calls, 1) << "an operation has a second outcome";
      state->Note(outcome.GetException());
    };
  }

  bool WaitFor(int count) const { return m_state->ended.WaitFor(count); }

  std::map<std::string, int> Get() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->texts;
  }

private:
  struct State {
    void Note(const std::exception_ptr &failure) {
      std::string text;
      try {
        if (failure) {
          std::rethrow_exception(failure);
        }
      } catch (const std::exception &error) {
        text = error.what();
      }
      {
        const std::lock_guard<std::mutex> lock(mutex);
        ++texts[text];
      }
      ended.Add();
    }

    std::mutex mutex;
    std::map<std::string, int> texts;
    EventCount ended;
  };

  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

/// Counts the requests that are about to be sent.
struct SentRequests final : OperationObserver {
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { count.Add(); }
  EventCount count;
};

class CancelledOperations : public testing::Test {
protected:
  std::unique_ptr<TokenClient> Client(const std::string &url, const ClientOptions &options = {}) const {
    return std::make_unique<TokenClient>(ConfigFor(*m_context, "", url), options);
  }

  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = TrustingContext();
};

TEST_F(CancelledOperations, HaveOneOutcomeEachWhenTheyAreCancelledAtRandomMoments) {
  constexpr int OPERATIONS = IS_SANITIZED ? 100 : 400;
  constexpr int AT_ONCE = 20;
  const auto client = Client(RunningService().GetUrl());
  Acquire(Form::CALLBACK, *client, ALICES, SpecFor(60)); // starts the threads
  const std::size_t threads = CountThreads();
  const std::size_t descriptors = CountDescriptors();
  const Outcomes outcomes;
  std::mt19937 random(16);
  std::vector<CancelSource> underWay;
  for (int i = 0; i < OPERATIONS; ++i) {
    CallOptions options;
    underWay.emplace_back();
    options.cancelToken = underWay.back().GetToken();
    client->AcquireAsync(ALICES, SpecFor(60), options, outcomes.ForNext());
    if (underWay.size() == AT_ONCE) {
      // The operations are at different steps by now. Half of them are cancelled, and the others continue.
      std::shuffle(underWay.begin(), underWay.end(), random);
      std::for_each(underWay.begin(), underWay.begin() + AT_ONCE / 2, [](const CancelSource &one) { one.Cancel(); });
      underWay.clear();
      outcomes.WaitFor(i - static_cast<int>(random() % AT_ONCE));
    }
  }
  ASSERT_TRUE(outcomes.WaitFor(OPERATIONS));
  std::map<std::string, int> texts = outcomes.Get();
  EXPECT_GE(texts[""], OPERATIONS / 2 - AT_ONCE);
  EXPECT_GT(texts["The operation was cancelled"], 0);
  EXPECT_EQ(texts[""] + texts["The operation was cancelled"], OPERATIONS);
  EXPECT_TRUE(Eventually([&] { return CountDescriptors() <= descriptors; }));
  EXPECT_TRUE(Eventually([&] { return CountThreads() <= threads + COMPUTING_AND_IO_THREADS; })) << CountThreads();
  EXPECT_NE(client->Acquire(ALICES, SpecFor(60)), nullptr);
}

TEST_F(CancelledOperations, OccupyNoThreadWhileTheyWait) {
  constexpr int OPERATIONS = 150;
  const auto sent = std::make_shared<SentRequests>();
  ClientOptions options;
  options.service.observer = sent;
  const auto client = Client(RunningService().FaultUrl("stall"), options);
  const std::size_t threads = CountThreads();
  const CancelSource cancel;
  CallOptions call;
  call.cancelToken = cancel.GetToken();
  const Outcomes outcomes;
  for (int i = 0; i < OPERATIONS; ++i) {
    client->AcquireAsync(ALICES, SpecFor(60), call, outcomes.ForNext());
  }
  EXPECT_TRUE(sent->count.WaitFor(OPERATIONS));
  EXPECT_TRUE(Eventually([&] { return CountThreads() <= threads + COMPUTING_AND_IO_THREADS; })) << CountThreads();
  cancel.Cancel();
  ASSERT_TRUE(outcomes.WaitFor(OPERATIONS));
  EXPECT_EQ(outcomes.Get(), (std::map<std::string, int>{{"The operation was cancelled", OPERATIONS}}));
}

TEST_F(CancelledOperations, EndWhenTheirClientIsDestroyed) {
  constexpr int OPERATIONS = 50;
  const auto sent = std::make_shared<SentRequests>();
  ClientOptions options;
  options.service.observer = sent;
  auto client = Client(RunningService().FaultUrl("stall"), options);
  const Outcomes outcomes;
  for (int i = 0; i < OPERATIONS; ++i) {
    client->AcquireAsync(ALICES, SpecFor(60), {}, outcomes.ForNext());
  }
  EXPECT_TRUE(sent->count.WaitFor(OPERATIONS / 2)); // the others are at earlier steps
  client.reset();
  ASSERT_TRUE(outcomes.WaitFor(OPERATIONS));
  EXPECT_EQ(outcomes.Get(),
            (std::map<std::string, int>{{"The operation was cancelled because its client was destroyed", OPERATIONS}}));
}

TEST_F(CancelledOperations, EndWhenTheLastCallbackDestroysTheClient) {
  auto client = std::make_shared<std::unique_ptr<TokenClient>>(Client(RunningService().GetUrl()));
  std::promise<std::string> destroyed;
  (*client)->AcquireAsync(ALICES, SpecFor(60), {}, [client, &destroyed](const TokenOutcome &outcome) {
    client->reset();
    destroyed.set_value(outcome.Get()->GetSubject().name);
  });
  client.reset();
  EXPECT_EQ(Await(destroyed.get_future()), "alice");
}

#if defined(__cpp_lib_jthread)
TEST_F(CancelledOperations, EndWhenTheThreadThatWaitsForThemMustStop) {
  const auto sent = std::make_shared<SentRequests>();
  ClientOptions clientOptions;
  clientOptions.service.observer = sent;
  const auto client = Client(RunningService().FaultUrl("stall"), clientOptions);
  std::jthread worker([&](const std::stop_token &stop) {
    CallOptions options;
    options.cancelToken = stop;
    EXPECT_THROWS_MESSAGE(client->Acquire(ALICES, SpecFor(60), options), CancelledException,
                          "The operation was cancelled");
  });
  ASSERT_TRUE(sent->count.WaitFor(1));
  worker.request_stop();
  worker.join();
}
#endif

} // namespace
} // namespace SsoClient
