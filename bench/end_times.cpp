// SPDX-License-Identifier: Apache-2.0

#include "end_times.h"

#include "crowd.h"
#include "median.h"

#include <ssoclient/client/exceptions.h>

#include <algorithm>
#include <chrono>
#include <future>
#include <stdexcept>
#include <vector>

namespace Bench {

namespace {

using Clock = std::chrono::steady_clock;

/// When an acquisition has ended. It must end with an exception of the class `Expected`.
template <typename Expected>
class End {
public:
  SsoClient::TokenCallback GetCallback() {
    return [this](const SsoClient::TokenOutcome &outcome) {
      const Clock::time_point now = Clock::now();
      try {
        outcome.Get();
        m_time.set_exception(std::make_exception_ptr(std::runtime_error("an acquisition has a token")));
      } catch (const Expected &) {
        m_time.set_value(now);
      } catch (...) {
        m_time.set_exception(std::current_exception());
      }
    };
  }

  Clock::time_point Wait() { return m_time.get_future().get(); }

private:
  std::promise<Clock::time_point> m_time;
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
  const int before = server.CountRequests();
  std::vector<End<SsoClient::DeadlineExceededException>> ends(count);
  const Clock::time_point first = Clock::now() + std::chrono::milliseconds(500) + count * std::chrono::milliseconds(1);
  for (std::size_t i = 0; i < count; ++i) {
    SsoClient::CallOptions options;
    options.deadline = first + i * std::chrono::milliseconds(1);
    client->AcquireAsync(GetCredential(), GetCrowdSpec(), options, ends[i].GetCallback());
  }
  WaitForRequests(server, before + static_cast<int>(count));
  if (Clock::now() > first) {
    throw std::runtime_error("the machine is too slow: a deadline has passed before all requests were under way");
  }
  std::vector<double> times;
  for (std::size_t i = 0; i < count; ++i) {
    times.push_back(Milliseconds(ends[i].Wait() - (first + i * std::chrono::milliseconds(1))));
  }
  return Summarise(times);
}

} // namespace Bench
