// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/logger.h>

#include <tarvel/service/app.h>

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

namespace {

using SsoClient::getLogger;
using Tarvel::Service::LogInternal;

// First in this file. `scripts/test` starts a process for each test, so these are the first calls.
TEST(GetLogger, ReturnsTheSameLoggerToThreadsThatCallItFirstAtTheSameTime) {
  constexpr std::size_t THREADS = 8;
  std::atomic<std::size_t> ready{0};
  std::vector<Tarvel::Service::Logger *> loggers(THREADS);
  std::vector<std::thread> threads;
  for (std::size_t i = 0; i < THREADS; ++i) {
    threads.emplace_back([&, i] {
      for (ready.fetch_add(1); ready.load() < THREADS;) {
        std::this_thread::yield();
      }
      loggers[i] = &getLogger();
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(std::vector<Tarvel::Service::Logger *>(THREADS, &getLogger()), loggers);
}

TEST(GetLogger, HasTheNameOfTheLibraryAndTheLevelOfOperations) {
  EXPECT_EQ("SsoClient", getLogger().GetName());
  EXPECT_EQ(64, getLogger().GetLevel());
}

TEST(GetLogger, WritesToTheSinkThatTheHostInstalls) {
  const auto root = Tarvel::Service::GetApp().GetRootLogger();
  std::vector<std::string> lines;
  root->SetSink([&](const Tarvel::Service::LogRecord &record) {
    lines.push_back(std::string(record.logger) + " " + std::to_string(record.level) + " " +
                    std::string(record.message));
  });
  LogInternal(getLogger(), SsoClient::LOG_LEVEL_OPERATION, "one %1", 1);
  LogInternal(getLogger(), SsoClient::LOG_LEVEL_OPERATION + 1, "too fine");
  LogInternal(getLogger(), SsoClient::LOG_LEVEL_CONTRACT_WARNING, "two %1", 2);
  root->SetSink({});
  EXPECT_EQ((std::vector<std::string>{"SsoClient 64 one 1", "SsoClient 8 two 2"}), lines);
}

} // namespace
