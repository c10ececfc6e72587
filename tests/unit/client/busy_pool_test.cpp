// SPDX-License-Identifier: Apache-2.0
// Outcomes when the threads for computations have more work than they can do.
#include "client_setup.h"
#include "stepped_time.h"

#include <tarvel/system/thread_pool.h>

#include <gtest/gtest.h>

#include <chrono>
#include <stdexcept>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Alice;
using Testing::ClientOn;
using Testing::ClientParts;
using Testing::EventCount;
using Testing::Gate;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Testing::SteppedTime;
using Strings = std::vector<std::string>;

/// Keeps all threads for computations busy, until it opens them one by one.
class BusyPool : public testing::Test {
protected:
  void Occupy() {
    for (Gate *const gate : {&first, &others}) {
      const std::size_t count = gate == &first ? 1 : Tarvel::System::COMPUTE_THREAD_CEILING - 1;
      for (std::size_t thread = 0; thread < count; ++thread) {
        Tarvel::System::GetComputePool()->QueueWorkItem([this, gate] {
          gate->Pass();
          left.Add();
        });
      }
      ASSERT_TRUE(gate->WaitForArrivals(static_cast<int>(count)));
    }
  }
  ~BusyPool() override {
    first.Open();
    others.Open();
    EXPECT_TRUE(left.WaitFor(Tarvel::System::COMPUTE_THREAD_CEILING));
  }

  TokenCallback Note(const std::string &name) {
    return [this, name](const TokenOutcome &) {
      order.push_back(name);
      outcomes.Add();
    };
  }

  /// Ends an operation while the steps of another one wait for a thread. @return what one thread does then
  Strings EndDuringOtherWork(const Executor &executor, bool isLate) {
    SteppedTime time;
    ClientParts parts;
    parts.time = &time;
    bool isNoting = false;
    parts.onCompose = [&] {
      if (isNoting) {
        order.push_back("composed");
      }
    };
    const auto transport = std::make_shared<ScriptedTransport>(Testing::Hold);
    const auto client = ClientOn(transport, parts);
    const CancelSource cancel;
    CallOptions options;
    options.cancelToken = cancel.GetToken();
    options.deadline = time.GetSteadyTime() + std::chrono::seconds(1);
    options.executor = executor;
    client->AcquireAsync(Alice(), SpecFor(60), options, Note("ended"));
    EXPECT_TRUE(transport->WaitForSent(1));
    Occupy();
    isNoting = true;
    client->AcquireAsync(Alice(), SpecFor(60), {}, Note("other"));
    if (isLate) {
      time.Advance(std::chrono::seconds(1));
    } else {
      cancel.Cancel();
    }
    first.Open();
    EXPECT_TRUE(outcomes.WaitFor(1));
    EXPECT_TRUE(transport->WaitForSent(2));
    Strings seen = order;
    transport->AnswerHeld(Testing::NoConnection());
    EXPECT_TRUE(outcomes.WaitFor(2));
    return seen;
  }

  Gate first; // of one thread
  Gate others;
  EventCount left;
  EventCount outcomes;
  Strings order; // written by one thread
};

TEST_F(BusyPool, CallsBackForACancelledOperationBeforeItComposesOthers) {
  EXPECT_EQ(EndDuringOtherWork({}, false), (Strings{"ended", "composed"}));
}

TEST_F(BusyPool, CallsBackForALateOperationBeforeItComposesOthers) {
  EXPECT_EQ(EndDuringOtherWork({}, true), (Strings{"ended", "composed"}));
}

TEST_F(BusyPool, CallsBackBeforeItComposesOthersIfTheExecutorRefuses) {
  EXPECT_EQ(EndDuringOtherWork([](const std::function<void()> &) { throw std::runtime_error("full"); }, false),
            (Strings{"ended", "composed"}));
}

} // namespace
} // namespace SsoClient
