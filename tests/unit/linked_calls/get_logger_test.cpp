// SPDX-License-Identifier: Apache-2.0
// Concurrent first calls of `getLogger`: each has made a logger before any of them publishes one.
#include <ssoclient/logger.h>

#include "support/rendezvous.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace {

using Tarvel::Ref;
using Tarvel::Service::Logger;
using Tarvel::Service::LogRoot;

constexpr int THREADS = 8;

Testing::Gate g_afterCreation;
Testing::EventCount g_created;
Testing::EventCount g_released;

class RecordedLogger final : public Logger {
public:
  RecordedLogger(std::string name, int level) : Logger(level), m_name(std::move(name)) { g_created.Add(); }
  ~RecordedLogger() override { g_released.Add(); }
  const std::string &GetName() const noexcept override { return m_name; }
  void Write(int, std::string_view) noexcept override {}

private:
  const std::string m_name;
};

} // namespace

// The linker redirects the library's calls of the platform's function to this.
Ref<Logger> CreateLoggerAndWait(const Ref<LogRoot> &root, std::string name,
                                int level) asm("__wrap__ZN6Tarvel7Service6Logger12CreateLoggerERKNS_3RefINS0_"
                                               "7LogRootEEENSt7__cxx1112basic_stringIcSt11char_traitsIcESa"
                                               "IcEEEi");
Ref<Logger> CreateLoggerAndWait(const Ref<LogRoot> &root, std::string name, int level) {
  EXPECT_TRUE(root);
  Ref<Logger> logger = Tarvel::MakeRef<RecordedLogger>(std::move(name), level);
  g_afterCreation.Pass();
  return logger;
}

namespace {

// The only test of this program that calls `getLogger`, so these are the first calls.
TEST(GetLogger, ReturnsOneLoggerToThreadsThatCallItFirstAtTheSameTime) {
  std::vector<Logger *> loggers(THREADS);
  std::vector<std::thread> threads;
  for (Logger *&logger : loggers) {
    threads.emplace_back([&logger] { logger = &SsoClient::getLogger(); });
  }
  EXPECT_TRUE(g_afterCreation.WaitForArrivals(THREADS));
  g_afterCreation.Open();
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(std::vector<Logger *>(THREADS, &SsoClient::getLogger()), loggers);
  EXPECT_EQ(THREADS, g_created.Get());
  EXPECT_EQ(THREADS - 1, g_released.Get());
  EXPECT_EQ("SsoClient", SsoClient::getLogger().GetName());
}

} // namespace
