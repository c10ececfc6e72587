// SPDX-License-Identifier: Apache-2.0
// The source and a simple model of it receive the same random events, and must do the same.

#include "support/repetitions.h"
#include "support/sanitized.h"
#include "unit/token_source/source_model.h"
#include "unit/token_source/source_stage.h"

#include <gtest/gtest.h>

#include <random>
#include <stdexcept>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;

namespace {

constexpr std::int64_t SECOND = 1'000'000;
constexpr const char *SEED = "SSOCLIENT_TEST_SEED";

/// The outcomes of the source without the parts of messages that the model leaves out.
std::string Shorten(const std::string &outcome) {
  if (outcome.find("that was invalidated") != std::string::npos) {
    return "SsoException: invalidated";
  }
  if (outcome.find("about to expire") != std::string::npos) {
    return "SsoException: expired";
  }
  return outcome;
}

class ModelRun {
public:
  explicit ModelRun(unsigned seed) : m_generator(seed) { StartSource(); }
  ModelRun(const ModelRun &) = delete;
  ModelRun &operator=(const ModelRun &) = delete;
  ~ModelRun() { m_provided->clear(); }

  /// One random event, for the source and for the model.
  /// @return what differs; empty if nothing does
  std::string Step() {
    m_stage->random = m_model.random = static_cast<double>(Draw(3)) / 2;
    m_events.clear();
    m_model.events.clear();
    const std::string event = Act();
    for (const std::string &text : m_events) {
      ++m_kinds[KindOf(text)];
    }
    if (m_stage->issuer->CountOpen() > 1) {
      return event + ": there are two requests";
    }
    return m_events == m_model.events ? "" : event + "\nsource:" + Join(m_events) + "\nmodel:" + Join(m_model.events);
  }

  /// How often each kind of event has been seen.
  const std::map<std::string, int> &GetKinds() const { return m_kinds; }

private:
  /// "renew", "acquire", "token", or the outcome of a call that fails.
  static std::string KindOf(const std::string &text) {
    const std::size_t colon = text.find(": ");
    if (colon == std::string::npos) {
      return text.substr(0, text.find(' '));
    }
    const std::string outcome = text.substr(colon + 2);
    return outcome.find(' ') == std::string::npos ? "token" : outcome;
  }

  static std::string Join(const std::vector<std::string> &texts) {
    std::string joined;
    for (const std::string &text : texts) {
      joined += " [" + text + "]";
    }
    return joined;
  }

  std::int64_t Draw(std::int64_t count) {
    return std::uniform_int_distribution<std::int64_t>(0, count - 1)(m_generator);
  }

  void StartSource() {
    if (!m_stage) {
      m_stage = std::make_unique<SourceStage>();
      m_model.wall = ReadClocks(m_stage->time).system;
    }
    if (m_provided) {
      m_provided->clear(); // its functions share it
    }
    m_provided = std::make_shared<std::deque<std::function<void()>>>();
    m_stage->blocking = [provided = m_provided](std::function<void()> function) {
      provided->push_back(std::move(function));
    };
    m_stage->provider = [this]() -> Credential {
      if (!m_isProviderWell) {
        throw std::runtime_error("the provider failed");
      }
      return PasswordCredential{"alice", Tarvel::SecretText("secret")};
    };
    m_stage->options.attemptTimeout = std::chrono::milliseconds(SourceModel::ATTEMPT_TIMEOUT / 1'000'000);
    m_stage->options.longestBackOff = std::chrono::milliseconds(SourceModel::LONGEST_BACK_OFF / 1'000'000);
    m_stage->issuer->OnRequest([this](const std::string &text) { m_events.push_back(text); });
  }

  std::string Act() {
    const std::int64_t event = Draw(100);
    if (event < 35) {
      return Ask();
    }
    if (event < 60) {
      return Advance();
    }
    if (event < 75) {
      return Answer();
    }
    if (event < 88) {
      return EndProvider();
    }
    if (event < 93) {
      return CancelOne();
    }
    if (event < 96) {
      return Invalidate();
    }
    return event < 99 ? SetClock() : Draw(5) == 0 ? Destroy() : "nothing";
  }

  std::string Ask() {
    const int call = ++m_calls;
    GetOptions options;
    std::int64_t deadline = SourceModel::NO_DEADLINE;
    if (Draw(3) == 0) {
      // Between two microseconds, so that nothing else happens at the same moment.
      const std::int64_t time = (Draw(40'000'000) - 1'000'000) * 1000 + 500;
      options.deadline = m_stage->time.GetSteadyTime() + std::chrono::nanoseconds(time);
      deadline = m_model.steady + time;
    }
    options.cancelToken = (m_cancels[call] = CancelSource()).GetToken();
    if (m_cancels.size() > 20) {
      m_cancels.erase(m_cancels.begin());
    }
    m_stage->Source().GetAsync(options, CancelToken(), [this, call](const TokenOutcome &outcome) {
      m_events.push_back(std::to_string(call) + ": " + Shorten(DescribeOutcome(outcome)));
    });
    m_model.Ask(call, deadline);
    return "ask";
  }

  std::string Advance() {
    const std::int64_t longest = std::vector<std::int64_t>{
        1'000, SECOND, 60 * SECOND, 3000 * SECOND}[static_cast<std::size_t>(Draw(20) == 0 ? 3 : Draw(3))];
    const std::int64_t time = Draw(longest) + 1;
    m_stage->time.Advance(std::chrono::microseconds(time));
    m_model.Advance(time * 1000);
    return "advance " + std::to_string(time);
  }

  std::string Answer() {
    if (!m_model.HasRequest()) {
      return "no request";
    }
    if (Draw(3) == 0) {
      m_stage->issuer->Answer(Failure("down"));
      m_model.Answer(nullptr);
      return "failure";
    }
    SourceModel::Token token;
    if (m_model.GetToken() && Draw(8) == 0) {
      token = *m_model.GetToken();
    } else {
      const std::int64_t start = m_model.wall + Draw(3) * Draw(20 * SECOND) - Draw(10 * SECOND);
      token = {"t" + std::to_string(++m_tokens), start, start + Draw(Draw(4) == 0 ? 20 * SECOND : 1000 * SECOND),
               Draw(2) == 0};
      token.id = Draw(10) == 0 ? "invalid" : token.id;
    }
    m_stage->issuer->Answer(std::shared_ptr<const SamlToken>(std::make_shared<DatedToken>(
        token.id, token.start, token.end, token.isRenewable ? DatedToken::Kind::RENEWABLE : DatedToken::Kind::BEARER)));
    m_model.Answer(&token);
    return "token";
  }

  std::string EndProvider() {
    if (!m_model.HasProviderCall()) {
      return "no provider call";
    }
    m_isProviderWell = Draw(8) != 0;
    const std::function<void()> call = m_provided->front();
    m_provided->pop_front();
    call();
    m_model.EndProvider(m_isProviderWell);
    return "provider";
  }

  std::string CancelOne() {
    const auto cancel = std::next(m_cancels.begin(), Draw(static_cast<std::int64_t>(m_cancels.size()) + 1));
    if (cancel == m_cancels.end()) {
      return "cancel nothing";
    }
    cancel->second.Cancel();
    m_model.Cancel(cancel->first);
    return "cancel " + std::to_string(cancel->first);
  }

  std::string Invalidate() {
    const std::string id = m_model.GetToken() && Draw(3) != 0 ? m_model.GetToken()->id
                           : Draw(2) == 0                     ? "invalid"
                                                              : "unknown";
    m_stage->Source().Invalidate(id);
    m_model.Invalidate(id);
    return "invalidate " + id;
  }

  std::string SetClock() {
    const std::int64_t later = Draw(Draw(2) == 0 ? 100 * SECOND : 2000 * SECOND) * (Draw(2) == 0 ? 1 : -1);
    m_stage->time.SetWallClock(std::chrono::microseconds(later));
    m_model.wall += later;
    return "clock " + std::to_string(later);
  }

  std::string Destroy() {
    m_stage->Close();
    m_model.Destroy();
    m_cancels.clear();
    StartSource();
    return "destroy";
  }

  std::mt19937 m_generator;
  SourceModel m_model;
  std::shared_ptr<std::deque<std::function<void()>>> m_provided;
  bool m_isProviderWell = true;
  std::vector<std::string> m_events;
  std::map<int, CancelSource> m_cancels;
  std::map<std::string, int> m_kinds;
  int m_calls = 0;
  int m_tokens = 0;
  std::unique_ptr<SourceStage> m_stage; // last, because calls end when it is destroyed
};

} // namespace

TEST(TokenSourceModel, DoesTheSameAsTheSourceAfterEachOfManyRandomEvents) {
  const char *const chosen = std::getenv(SEED);
  const unsigned seed = chosen ? static_cast<unsigned>(std::stoul(chosen)) : std::random_device()();
  ModelRun run(seed);
  const int events = Repetitions(1'000'000, IS_SANITIZED ? 20'000 : 50'000);
  for (int event = 0; event < events; ++event) {
    ASSERT_EQ(run.Step(), "") << "event " << event << " of the seed " << seed << "; " << SEED << "=" << seed
                              << " repeats it";
  }
  for (const char *const kind :
       {"acquire", "renew", "token", "CommunicationException: down", "SsoException: expired",
        "SsoException: invalidated", "another: the provider failed", "CancelledException: The operation was cancelled",
        "CancelledException: The operation was cancelled because its token source was destroyed",
        "DeadlineExceededException: The deadline passed before the operation ended"}) {
    EXPECT_GT(run.GetKinds().count(kind), 0U) << kind << " never happened with the seed " << seed;
  }
}

} // namespace Testing
