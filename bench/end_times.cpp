// SPDX-License-Identifier: Apache-2.0

#include "end_times.h"

#include "crowd.h"
#include "median.h"

#include <ssoclient/client/exceptions.h>

#include <algorithm>
#include <chrono>
#include <future>
#include <memory>
#include <stdexcept>
#include <thread>
#include <vector>

namespace Bench {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::minutes LONGEST_START{1}; // for acquisitions to be under way before their deadlines

/// When an acquisition has ended. It must end with an exception of the class `Expected`. The callback has its own reference
/// to the result: another failure ends the measurement while acquisitions are under way.
template <typename Expected>
class End {
public:
  SsoClient::TokenCallback GetCallback() {
    return [time = m_time](const SsoClient::TokenOutcome &outcome) {
      const Clock::time_point now = Clock::now();
      try {
        outcome.Get();
        time->set_exception(std::make_exception_ptr(std::runtime_error("an acquisition has a token")));
      } catch (const Expected &) {
        time->set_value(now);
      } catch (...) {
        time->set_exception(std::current_exception());
      }
    };
  }

  Clock::time_point Wait() { return m_time->get_future().get(); }

private:
  const std::shared_ptr<std::promise<Clock::time_point>> m_time = std::make_shared<std::promise<Clock::time_point>>();
};

SsoClient::Credential GetCredential() {
  return SsoClient::PasswordCredential{CROWD_USER, Tarvel::SecretText(std::string(CROWD_PASSWORD))};
}

EndTimes Summarise(const std::vector<double> &milliseconds) {
  return {MedianOf(milliseconds), *std::max_element(milliseconds.begin(), milliseconds.end())};
}

double Milliseconds(Clock::duration time) {
  return std::chrono::duration<double, std::milli>(time).count();
}

struct DeadlineRun {
  std::vector<double> times;    ///< by how many milliseconds each acquisition ended after its deadline
  bool wereAllUnderWay = false; ///< before the first deadline
};

/// Starts acquisitions whose deadlines are a millisecond apart, and waits for their ends.
DeadlineRun RunDeadlines(const Testing::HeldServer &server, const SsoClient::TokenClient &client, std::size_t count,
                         Clock::time_point first) {
  const int all = server.CountRequests() + static_cast<int>(count);
  std::vector<End<SsoClient::DeadlineExceededException>> ends(count);
  for (std::size_t i = 0; i < count; ++i) {
    SsoClient::CallOptions options;
    options.deadline = first + i * std::chrono::milliseconds(1);
    client.AcquireAsync(GetCredential(), GetCrowdSpec(), options, ends[i].GetCallback());
  }
  while (server.CountRequests() < all && Clock::now() < first) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  DeadlineRun run;
  run.wereAllUnderWay = server.CountRequests() >= all && Clock::now() < first;
  for (std::size_t i = 0; i < count; ++i) {
    run.times.push_back(Milliseconds(ends[i].Wait() - (first + i * std::chrono::milliseconds(1))));
  }
  return run;
}

} // namespace

EndTimes MeasureCancel(const Testing::HeldServer &server, std::size_t underWay, std::size_t samples) {
  const auto client = ConnectTo(server);
  const int before = server.CountRequests();
  std::vector<SsoClient::CancelSource> sources(underWay + samples);
  std::vector<End<SsoClient::CancelledException>> ends(underWay + samples);
  std::size_t started = 0;
  const auto startUntil = [&](std::size_t count) {
    for (; started < count; ++started) {
      SsoClient::CallOptions options;
      options.cancelToken = sources[started].GetToken();
      client->AcquireAsync(GetCredential(), GetCrowdSpec(), options, ends[started].GetCallback());
    }
    WaitForRequests(server, before + static_cast<int>(started));
  };
  std::vector<double> times;
  for (std::size_t sample = 0; sample < samples; ++sample) {
    startUntil(sample + underWay);
    const Clock::time_point cancelled = Clock::now();
    sources[sample].Cancel();
    times.push_back(Milliseconds(ends[sample].Wait() - cancelled));
  }
  for (std::size_t rest = samples; rest < started; ++rest) {
    sources[rest].Cancel();
    ends[rest].Wait();
  }
  return Summarise(times);
}

EndTimes MeasureDeadline(const Testing::HeldServer &server, std::size_t count) {
  const auto client = ConnectTo(server);
  Clock::duration start = std::chrono::milliseconds(500) + count * std::chrono::milliseconds(1);
  for (; start < LONGEST_START; start *= 2) {
    const DeadlineRun run = RunDeadlines(server, *client, count, Clock::now() + start);
    if (run.wereAllUnderWay) {
      return Summarise(run.times);
    }
  }
  throw std::runtime_error("the machine is too slow: a deadline has passed before all requests were under way");
}

} // namespace Bench
