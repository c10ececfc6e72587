// SPDX-License-Identifier: Apache-2.0
// A source with a file cache.

#include "support/recorded_log.h"
#include "support/work_folder.h"
#include "unit/token_source/source_stage.h"

#include <ssoclient/exceptions.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <sys/stat.h>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;

namespace {

/// Each stage represents a program, and both use the same file.
class CachedSource : public testing::Test {
protected:
  CachedSource() : m_path(m_folder / "token") {
    m_first.cache = m_second.cache = std::make_shared<const TokenCacheFile>(
        m_path, CacheBinding{"https://sts.example/", "alice", TokenSpec(), ""}, [this](const std::string &xml) {
          const auto token = m_tokens.find(xml);
          return token == m_tokens.end() ? throw ParseException("unknown") : token->second;
        });
  }

  std::shared_ptr<const SamlToken> Token(const std::string &id, std::chrono::nanoseconds lifetime) {
    const auto token = m_first.Token(id, lifetime);
    m_tokens[token->ToXml()] = token;
    return token;
  }

  void AdvanceBoth(std::chrono::nanoseconds time) {
    m_first.time.Advance(time);
    m_second.time.Advance(time);
  }

  const WorkFolder m_folder;
  const std::string m_path;
  std::map<std::string, std::shared_ptr<const SamlToken>> m_tokens;
  SourceStage m_first;
  SourceStage m_second;
};

} // namespace

TEST_F(CachedSource, SharesItsTokenWithTheNextProgram) {
  m_first.Provide(Token("shared", 1000s));
  EXPECT_EQ(m_first.Ask(), "shared");
  EXPECT_EQ(m_second.Ask(), "shared");
  EXPECT_EQ(m_second.issuer->Count(), 0U);
}

TEST_F(CachedSource, WritesTheTokenBeforeItReturnsIt) {
  std::string content;
  m_first.Source().GetAsync({}, CancelToken(), [&](const TokenOutcome &) { content = m_folder.Read("token"); });
  m_first.issuer->Answer(Token("shared", 1000s));
  EXPECT_NE(content.find("<shared>"), std::string::npos);
}

TEST_F(CachedSource, AsksTheServiceInOneOfTwoPrograms) {
  OutcomeList outcomes;
  EXPECT_EQ(m_first.Ask(), "waits");
  m_second.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  AdvanceBoth(100ms);
  EXPECT_EQ(m_second.issuer->Count(), 0U);
  EXPECT_THAT(outcomes.Get(), IsEmpty());
  m_first.issuer->Answer(Token("shared", 1000s));
  AdvanceBoth(20ms);
  EXPECT_THAT(outcomes.Get(), ElementsAre("shared"));
  EXPECT_EQ(m_second.issuer->Count(), 0U);
}

TEST_F(CachedSource, TakesOverWhenTheOtherProgramFails) {
  EXPECT_EQ(m_first.Ask(), "waits");
  EXPECT_EQ(m_second.Ask(), "waits");
  m_first.issuer->Answer(Failure("down"));
  AdvanceBoth(20ms);
  EXPECT_EQ(m_second.issuer->Count(), 1U);
}

TEST_F(CachedSource, StopsWaitingForTheLockWhenTheTimeOfTheAttemptIsOver) {
  m_second.options.attemptTimeout = 5s;
  EXPECT_EQ(m_first.Ask(), "waits");
  OutcomeList outcomes;
  m_second.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  m_second.time.Advance(5s);
  EXPECT_THAT(outcomes.Get(), ElementsAre("DeadlineExceededException: The deadline passed before the operation ended"));
  m_second.time.Advance(20ms);
  EXPECT_EQ(m_second.time.CountTimers(), 0U);
}

TEST_F(CachedSource, UnlocksTheFileWhenTheTimeOfTheAttemptIsOver) {
  m_first.options.attemptTimeout = 5s;
  EXPECT_EQ(m_first.Ask(), "waits");
  EXPECT_EQ(m_second.Ask(), "waits");
  AdvanceBoth(5s);
  AdvanceBoth(20ms);
  EXPECT_EQ(m_second.issuer->Count(), 1U);
}

TEST_F(CachedSource, UnlocksTheFileWhenItIsDestroyed) {
  EXPECT_EQ(m_first.Ask(), "waits");
  m_first.Close();
  EXPECT_EQ(m_second.Ask(), "waits");
  EXPECT_EQ(m_second.issuer->Count(), 1U);
}

TEST_F(CachedSource, UsesADueTokenOfTheFileWhileAnotherProgramRefreshesIt) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  EXPECT_EQ(m_first.Ask(), "first");
  EXPECT_EQ(m_first.issuer->CountOpen(), 1U);
  EXPECT_EQ(m_second.Ask(), "first");
  EXPECT_EQ(m_second.issuer->Count(), 0U);
}

TEST_F(CachedSource, UsesADueTokenOfTheFileWhenTheServiceFails) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  OutcomeList outcomes;
  m_second.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  EXPECT_EQ(m_second.issuer->Count(), 1U);
  m_second.issuer->Answer(Failure("down"));
  EXPECT_THAT(outcomes.Get(), ElementsAre("first"));
}

TEST_F(CachedSource, WaitsForTheBackOffWhenItUsesADueTokenBecauseTheServiceFails) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  EXPECT_EQ(m_second.Ask(), "waits");
  m_second.issuer->Answer(Failure("down"));
  m_second.time.Advance(1s - 1us);
  EXPECT_EQ(m_second.Ask(), "first");
  EXPECT_EQ(m_second.issuer->Count(), 1U);
  m_second.time.Advance(1us);
  EXPECT_EQ(m_second.issuer->Count(), 2U) << "a call has asked since";
}

TEST_F(CachedSource, DoesNotUseATokenOfTheFileThatIsAboutToExpire) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(970s);
  OutcomeList outcomes;
  m_second.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  m_second.issuer->Answer(Failure("down"));
  EXPECT_THAT(outcomes.Get(), ElementsAre("CommunicationException: down"));
}

TEST_F(CachedSource, ReportsTheFailureAtOnceWhenTheDueTokenOfTheFileIsInvalidated) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  EXPECT_EQ(m_second.Ask(), "waits");
  m_second.issuer->Answer(Failure("down"));
  m_second.Source().Invalidate("first");
  EXPECT_EQ(m_second.Ask(), "CommunicationException: down");
  EXPECT_EQ(m_second.issuer->Count(), 1U);
}

TEST_F(CachedSource, UsesADueTokenOfTheFileWhenTheServiceDoesNotAnswerSoon) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  OutcomeList outcomes;
  m_second.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  AdvanceBoth(2s - 1us);
  EXPECT_THAT(outcomes.Get(), IsEmpty());
  AdvanceBoth(1us);
  EXPECT_THAT(outcomes.Get(), ElementsAre("first"));
  EXPECT_EQ(m_second.issuer->CountOpen(), 0U) << "the request is cancelled";
  AdvanceBoth(1s);
  EXPECT_EQ(m_second.Ask(), "first");
  AdvanceBoth(20s);
  EXPECT_EQ(m_second.issuer->CountOpen(), 1U) << "no call waits for the next request, which has more time";
}

TEST_F(CachedSource, ReportsTheFailureWhenTheTokenOfTheFileHasEndedMeanwhile) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(969s);
  OutcomeList outcomes;
  m_second.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  AdvanceBoth(1s);
  m_second.issuer->Answer(Failure("down"));
  EXPECT_THAT(outcomes.Get(), ElementsAre("CommunicationException: down"));
}

TEST_F(CachedSource, RefreshesItsTokenFromTheFile) {
  m_first.Provide(Token("first", 1000s));
  EXPECT_EQ(m_second.Ask(), "first");
  AdvanceBoth(800s);
  EXPECT_EQ(m_first.Ask(), "first");
  m_first.issuer->Answer(Token("second", 1000s));
  EXPECT_EQ(m_second.Ask(), "first");
  EXPECT_EQ(m_second.Ask(), "second");
  EXPECT_EQ(m_second.issuer->Count(), 0U);
}

TEST_F(CachedSource, RemovesAnInvalidatedTokenFromTheFile) {
  m_first.Provide(Token("first", 1000s));
  EXPECT_EQ(m_second.Ask(), "first");
  m_second.Source().Invalidate("first");
  EXPECT_EQ(m_folder.Read("token"), "");
  EXPECT_EQ(m_second.Ask(), "waits");
  EXPECT_EQ(m_second.issuer->Count(), 1U);
}

TEST_F(CachedSource, DoesNotUseAnInvalidatedTokenThatAnotherProgramWritesAgain) {
  const auto token = Token("first", 1000s);
  m_first.Source().Invalidate("first");
  m_second.Provide(token);
  EXPECT_EQ(m_first.Ask(), "waits");
  EXPECT_EQ(m_first.issuer->Count(), 1U);
}

TEST_F(CachedSource, RemovesAnInvalidatedTokenAfterAnotherProgramHasUnlockedTheFile) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  EXPECT_EQ(m_second.Ask(), "waits");
  m_first.Source().Invalidate("first");
  EXPECT_NE(m_folder.Read("token"), "");
  m_second.issuer->Answer(Failure("down"));
  AdvanceBoth(20ms);
  EXPECT_EQ(m_folder.Read("token"), "");
}

TEST_F(CachedSource, MakesNoFileToRemoveAnInvalidatedToken) {
  m_first.Source().Invalidate("first");
  EXPECT_EQ(m_folder.Names(), std::set<std::string>{});

  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  EXPECT_EQ(m_second.Ask(), "waits"); // it has locked the file
  m_first.Source().Invalidate("first");
  ASSERT_EQ(::unlink(m_path.c_str()), 0);
  AdvanceBoth(20ms);
  EXPECT_EQ(m_folder.Names(), std::set<std::string>{});
}

TEST_F(CachedSource, DoesNotWaitForTheLockOfAFileThatDoesNotHaveTheInvalidatedToken) {
  m_first.Provide(Token("first", 1000s));
  AdvanceBoth(800s);
  EXPECT_EQ(m_second.Ask(), "waits"); // it has locked the file
  const std::size_t timers = m_first.time.CountTimers();
  m_first.Source().Invalidate("another");
  EXPECT_EQ(m_first.time.CountTimers(), timers);
}

TEST_F(CachedSource, EndsTheCallWhenTheFileIsRefusedAndWorksAfterwards) {
  m_folder.Write("token", "");
  ASSERT_EQ(::chmod(m_path.c_str(), 0644), 0);
  EXPECT_THAT(m_first.Ask(), StartsWith("IOException: "));
  EXPECT_EQ(m_first.issuer->Count(), 0U) << "no token that another user could read";
  ASSERT_EQ(::chmod(m_path.c_str(), 0600), 0);
  m_first.time.Advance(1s);
  m_first.Provide(Token("first", 1000s));
  EXPECT_EQ(m_first.Ask(), "first");
}

TEST_F(CachedSource, ReturnsATokenThatCannotBeWritten) {
  EXPECT_EQ(m_first.Ask(), "waits");
  ASSERT_EQ(::mkdir((m_path + ".new").c_str(), 0700), 0);
  const RecordedLog log;
  m_first.issuer->Answer(Token("first", 1000s));
  EXPECT_EQ(m_first.Ask(), "first");
  EXPECT_THAT(log.Lines(), ElementsAre(StartsWith("SsoClient 8 The token was not written to the cache: ")));
}

TEST_F(CachedSource, ReturnsATokenWhoseWritingTakesTooLong) {
  m_first.options.attemptTimeout = 5s;
  std::deque<std::function<void()>> queue;
  m_first.blocking = [&](std::function<void()> function) { queue.push_back(std::move(function)); };
  OutcomeList outcomes;
  m_first.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  for (int step = 0; step < 2; ++step) { // first the file, then the provider
    queue.front()();
    queue.pop_front();
  }
  m_first.issuer->Answer(Token("first", 1000s));
  EXPECT_THAT(outcomes.Get(), IsEmpty());
  m_first.time.Advance(5s);
  EXPECT_THAT(outcomes.Get(), ElementsAre("first"));
}

} // namespace Testing
