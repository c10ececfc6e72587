// SPDX-License-Identifier: Apache-2.0

#include <tarvel/service/logger.h>

#include <tarvel/core/string_util.h>
#include <tarvel/service/app.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace Tarvel::Service {
namespace {

constexpr int LEVEL_WARNING = 8;
constexpr int LEVEL_OPERATION = 64;

class LoggerTest : public testing::Test {
protected:
  ~LoggerTest() override { m_root->SetSink(nullptr); }

  void Gather() {
    m_root->SetSink([this](const LogRecord &record) {
      m_lines.push_back(std::string(record.logger) + "/" + std::to_string(record.level) + "/" +
                        std::string(record.message));
    });
  }

  const Ref<LogRoot> m_root = GetApp().GetRootLogger();
  std::vector<std::string> m_lines;
};

TEST_F(LoggerTest, AppHasOneRootWithoutSink) {
  EXPECT_EQ(GetApp().GetRootLogger(), m_root);
  EXPECT_EQ(&GetApp(), &GetApp());
  EXPECT_FALSE(m_root->HasSink());
}

TEST_F(LoggerTest, PrintsNothingWithoutSink) {
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "Quiet", LEVEL_OPERATION);
  testing::internal::CaptureStdout();
  testing::internal::CaptureStderr();
  LogInternal(*logger, LEVEL_WARNING, "nobody %1", "listens");
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST_F(LoggerTest, PassesNameLevelAndFormattedMessageToTheSink) {
  Gather();
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "Name", LEVEL_OPERATION);
  EXPECT_EQ(logger->GetName(), "Name");
  LogInternal(*logger, LEVEL_OPERATION, "opId=%1 END %2", 17, "operation");
  EXPECT_EQ(m_lines, std::vector<std::string>{"Name/64/opId=17 END operation"});
}

TEST_F(LoggerTest, CutsALineAtTheMaximumLength) {
  Gather();
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_OPERATION);
  const std::string whole(StringUtil::MAX_LINE_BYTES, 'x');
  LogInternal(*logger, LEVEL_OPERATION, "%1", whole);
  LogInternal(*logger, LEVEL_OPERATION, "%1y", whole);
  LogInternal(*logger, LEVEL_OPERATION, "%1", std::string(16u * 1024 * 1024, 'x'));
  EXPECT_EQ(m_lines, (std::vector<std::string>{"L/64/" + whole, "L/64/" + whole + "... (1 more bytes)",
                                               "L/64/" + whole + "... (16770048 more bytes)"}));
  EXPECT_LT(m_lines.back().size(), 8u * 1024);
}

TEST_F(LoggerTest, WritesLinesUpToItsLevel) {
  Gather();
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_WARNING);
  EXPECT_EQ(logger->GetLevel(), LEVEL_WARNING);
  LogInternal(*logger, LEVEL_WARNING, "kept");
  LogInternal(*logger, LEVEL_WARNING + 1, "dropped");
  logger->SetLevel(LEVEL_OPERATION);
  LogInternal(*logger, LEVEL_OPERATION, "kept too");
  EXPECT_EQ(m_lines, (std::vector<std::string>{"L/8/kept", "L/64/kept too"}));
}

struct Costly {
  int *formatted;
};

std::string FormatMessageArgument(const Costly &value) {
  ++*value.formatted;
  return "costly";
}

TEST_F(LoggerTest, FormatsNothingForALineThatIsDropped) {
  Gather();
  int formatted = 0;
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_WARNING);
  LogInternal(*logger, LEVEL_OPERATION, "%1", Costly{&formatted});
  EXPECT_EQ(formatted, 0);
  LogInternal(*logger, LEVEL_WARNING, "%1", Costly{&formatted});
  EXPECT_EQ(formatted, 1);
}

TEST_F(LoggerTest, IgnoresAnExceptionOfTheSink) {
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_OPERATION);
  int calls = 0;
  m_root->SetSink([&](const LogRecord &) {
    ++calls;
    throw std::runtime_error("disk full");
  });
  EXPECT_NO_THROW(LogInternal(*logger, LEVEL_WARNING, "one"));
  m_root->SetSink([&](const LogRecord &) {
    ++calls;
    throw 42;
  });
  EXPECT_NO_THROW(LogInternal(*logger, LEVEL_WARNING, "two"));
  EXPECT_EQ(calls, 2);
}

TEST_F(LoggerTest, ReplacesAndRemovesTheSink) {
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_OPERATION);
  int first = 0;
  int second = 0;
  m_root->SetSink([&](const LogRecord &) { ++first; });
  LogInternal(*logger, 1, "a");
  m_root->SetSink([&](const LogRecord &) { ++second; });
  EXPECT_TRUE(m_root->HasSink());
  LogInternal(*logger, 1, "b");
  m_root->SetSink(nullptr);
  EXPECT_FALSE(m_root->HasSink());
  LogInternal(*logger, 1, "c");
  EXPECT_EQ(first, 1);
  EXPECT_EQ(second, 1);
}

TEST_F(LoggerTest, AllowsASinkToLogAndToRemoveItself) {
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_OPERATION);
  int calls = 0;
  m_root->SetSink([&](const LogRecord &) {
    ++calls;
    m_root->SetSink(nullptr);
    LogInternal(*logger, 1, "from the sink");
  });
  LogInternal(*logger, 1, "first");
  EXPECT_EQ(calls, 1);
}

TEST_F(LoggerTest, ReleasesTheSinkThatIsRemoved) {
  const auto held = std::make_shared<int>(0);
  m_root->SetSink([held](const LogRecord &) {});
  EXPECT_EQ(held.use_count(), 2);
  m_root->SetSink(nullptr);
  EXPECT_EQ(held.use_count(), 1);
}

TEST_F(LoggerTest, LoggerWithoutRootDropsItsLines) {
  Gather();
  const Ref<Logger> logger = Logger::CreateLogger(nullptr, "Alone", LEVEL_OPERATION);
  LogInternal(*logger, 1, "unheard");
  EXPECT_TRUE(m_lines.empty());
}

TEST_F(LoggerTest, TwoThreadsLogWhileTheSinkIsReplaced) {
  constexpr int LINES = 5'000;
  const Ref<Logger> logger = Logger::CreateLogger(m_root, "L", LEVEL_OPERATION);
  std::atomic<int> heard{0};
  const LogSink sink = [&](const LogRecord &record) { heard += record.message == "line 7" ? 1 : LINES * 10; };
  m_root->SetSink(sink);
  std::vector<std::thread> threads;
  for (int i = 0; i < 2; ++i) {
    threads.emplace_back([&] {
      for (int n = 0; n < LINES; ++n) {
        LogInternal(*logger, 1, "line %1", 7);
      }
    });
  }
  for (int n = 0; n < 500; ++n) {
    m_root->SetSink(sink);
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(heard, 2 * LINES);
}

} // namespace
} // namespace Tarvel::Service
