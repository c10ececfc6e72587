// SPDX-License-Identifier: Apache-2.0
// Random calls, compared with what a map contains.
#include "guarded_clock.h"

#include <ssoclient/proof/replay_guard.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <map>
#include <random>
#include <string>

namespace ReplayGuardTest {
namespace {

using Answer = SsoClient::ReplayGuard::Answer;

constexpr std::int64_t START = 1'700'000'000'000'000;
constexpr int CALLS = 60'000;

struct Setting {
  std::size_t capacity;
  std::uint64_t identifiers; ///< how many different ones there are
  std::int64_t longest;      ///< the longest time for which a message is remembered
  bool isClockChanged;       ///< whether the clock is sometimes set forward and back
};

class Model {
public:
  explicit Model(std::size_t capacity) : m_capacity(capacity) {}

  /// Whether the guard may give this answer to the call; afterwards the model has changed like the guard.
  ::testing::AssertionResult Expect(Answer answer, std::uint64_t message, std::int64_t until, std::int64_t now) {
    const auto known = m_untils.find(message);
    const bool isKnown = known != m_untils.end();
    const bool isCurrent = isKnown && known->second > now;
    m_latestNow = std::max(m_latestNow, now);
    m_callsWithSpace = CountCurrent(now) * 5 <= m_capacity * 4 ? m_callsWithSpace + 1 : 0;
    switch (answer) {
    case Answer::FIRST:
      // It may have been known, if that time was over before the clock was set back, and it has a later time now.
      if (until <= now || (isKnown && (known->second > m_latestNow || known->second >= until))) {
        return ::testing::AssertionFailure() << "first";
      }
      m_untils[message] = until;
      return CountCurrent(m_latestNow) <= m_capacity ? ::testing::AssertionSuccess()
                                                     : ::testing::AssertionFailure() << "above the capacity";
    case Answer::REPEATED:
      return isKnown ? ::testing::AssertionSuccess() : ::testing::AssertionFailure() << "repeated";
    case Answer::UNAVAILABLE:
      // Its time is over, or was over before the clock was set back; or there are, or were recently, many messages.
      if (until > m_latestNow && m_callsWithSpace > m_capacity + ROUND) {
        return ::testing::AssertionFailure() << "unavailable";
      }
      return !isCurrent || m_latestNow > now ? ::testing::AssertionSuccess()
                                             : ::testing::AssertionFailure() << "forgotten";
    }
    return ::testing::AssertionFailure() << "no answer";
  }

private:
  static constexpr std::size_t ROUND = 8; // in so many calls, more than the slots of the smallest tables are swept

  std::size_t CountCurrent(std::int64_t now) const {
    return static_cast<std::size_t>(
        std::count_if(m_untils.begin(), m_untils.end(), [now](const auto &entry) { return entry.second > now; }));
  }

  const std::size_t m_capacity;
  std::map<std::uint64_t, std::int64_t> m_untils; // by message, the last time with which it was answered FIRST
  std::int64_t m_latestNow = 0;
  std::size_t m_callsWithSpace = 0;
};

class ReplayModel : public ::testing::TestWithParam<Setting> {};

TEST_P(ReplayModel, AnswersLikeTheGuard) {
  const Setting setting = GetParam();
  std::mt19937_64 random(setting.capacity);
  const auto below = [&random](std::uint64_t end) { return static_cast<std::int64_t>(random() % end); };
  SetClock clock(START);
  const auto guard = SsoClient::CreateMemoryReplayGuard(setting.capacity);
  Model model(setting.capacity);
  std::int64_t time = START;
  std::map<Answer, int> answers;
  for (int call = 0; call < CALLS; ++call) {
    time += below(3);
    const std::int64_t change = setting.isClockChanged && below(20) == 0 ? below(200) - 100 : 0;
    clock.Set(time + change);
    const auto message = static_cast<std::uint64_t>(below(setting.identifiers));
    const std::int64_t until = time + below(static_cast<std::uint64_t>(setting.longest)) - 2;
    const Answer answer = guard->Remember(MakeIdentifier(message), At(until));
    ++answers[answer];
    ASSERT_TRUE(model.Expect(answer, message, until, clock.Get())) << "call " << call;
  }
  for (const Answer answer : {Answer::FIRST, Answer::REPEATED, Answer::UNAVAILABLE}) {
    EXPECT_GT(answers[answer], CALLS / 1000) << "too few answers " << static_cast<int>(answer);
  }
}

INSTANTIATE_TEST_SUITE_P(With, ReplayModel,
                         ::testing::Values(Setting{1, 3, 4, false}, Setting{2, 5, 8, false}, Setting{3, 10, 9, true},
                                           Setting{6, 30, 15, false}, Setting{13, 60, 40, true},
                                           Setting{60, 300, 120, false}, Setting{100, 400, 250, true},
                                           Setting{150, 500, 420, false}),
                         [](const auto &setting) {
                           return std::to_string(setting.param.capacity) + "Places" +
                                  (setting.param.isClockChanged ? "AndAChangingClock" : "");
                         });

} // namespace
} // namespace ReplayGuardTest
