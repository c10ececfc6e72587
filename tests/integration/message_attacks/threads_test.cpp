// SPDX-License-Identifier: Apache-2.0
// One verifier on many threads.

#include "judged_message.h"
#include "message_files.h"

#include "support/fixed_environment.h"

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

namespace Messages {
namespace {

TEST(MessageVerifierOnManyThreads, DecidesLikeOnOneThread) {
  constexpr int THREADS = 8;
  constexpr int ROUNDS = 3;
  const Testing::FixedEnvironment clock;
  const Receiver receiver = MakeReceiver("");
  std::atomic<int> differences{0};
  std::vector<std::thread> threads;
  for (int number = 0; number < THREADS; ++number) {
    threads.emplace_back([&] {
      for (int round = 0; round < ROUNDS; ++round) {
        for (const MessageFile &file : AllMessageFiles()) {
          const bool isExpected =
              !file.options.empty() || Verify(receiver, file.xml).message.has_value() == file.IsAccepted();
          differences += isExpected ? 0 : 1;
        }
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(0, differences);
}

} // namespace
} // namespace Messages
