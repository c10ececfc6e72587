// SPDX-License-Identifier: Apache-2.0

#include "fresh_get.h"

#include "median.h"

#include <ssoclient/client/token_source.h>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <atomic>
#include <barrier>
#include <chrono>
#include <cstddef>
#include <mutex>
#include <thread>
#include <vector>

namespace Bench {

namespace {

using TokenPtr = std::shared_ptr<const SsoClient::SamlToken>;

using Clock = std::chrono::steady_clock;

/// When one thread has begun and ended.
struct Period {
  Clock::time_point begin;
  Clock::time_point end;
};

/// Nanoseconds for one call of `get`. Each thread calls it `calls` times.
template <typename Get>
double Measure(int threads, int calls, const Get &get) {
  std::barrier start(threads);
  std::vector<Period> periods(static_cast<std::size_t>(threads));
  std::vector<std::thread> running;
  for (Period &period : periods) {
    running.emplace_back([&] {
      start.arrive_and_wait();
      period.begin = Clock::now();
      for (int call = 0; call < calls; ++call) {
        benchmark::DoNotOptimize(get());
      }
      period.end = Clock::now();
    });
  }
  for (std::thread &thread : running) {
    thread.join();
  }
  const auto first = std::min_element(periods.begin(), periods.end(),
                                      [](const Period &left, const Period &right) { return left.begin < right.begin; });
  const auto last = std::max_element(periods.begin(), periods.end(),
                                     [](const Period &left, const Period &right) { return left.end < right.end; });
  const std::chrono::duration<double, std::nano> time = last->end - first->begin;
  return time.count() / calls;
}

} // namespace

GetTimes MeasureGet(const SsoClient::TokenSource &source, int threads, int rounds, int calls) {
  const TokenPtr token = source.Get();
  const std::atomic<TokenPtr> atomic(token);
  std::mutex mutex;
  std::vector<double> ours;
  std::vector<double> atomics;
  std::vector<double> mutexes;
  std::vector<double> ratios;
  for (int round = 0; round < rounds; ++round) {
    ours.push_back(Measure(threads, calls, [&] { return source.Get(); }));
    atomics.push_back(Measure(threads, calls, [&] { return atomic.load(); }));
    mutexes.push_back(Measure(threads, calls, [&] {
      const std::lock_guard<std::mutex> lock(mutex);
      return token;
    }));
    ratios.push_back(ours.back() / atomics.back());
  }
  return {MedianOf(ours), MedianOf(atomics), MedianOf(mutexes), MedianOf(ratios)};
}

} // namespace Bench
