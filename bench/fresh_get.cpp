// SPDX-License-Identifier: Apache-2.0

#include "fresh_get.h"

#include "median.h"

#include <ssoclient/client/token_source.h>

#include <benchmark/benchmark.h>

#include <atomic>
#include <barrier>
#include <chrono>
#include <mutex>
#include <thread>
#include <vector>

namespace Bench {

namespace {

using TokenPtr = std::shared_ptr<const SsoClient::SamlToken>;

/// Nanoseconds for one call of `get`, which each thread calls `calls` times.
template <typename Get>
double Measure(int threads, int calls, const Get &get) {
  std::barrier start(threads + 1);
  std::vector<std::thread> running;
  for (int i = 0; i < threads; ++i) {
    running.emplace_back([&] {
      start.arrive_and_wait();
      for (int call = 0; call < calls; ++call) {
        benchmark::DoNotOptimize(get());
      }
    });
  }
  start.arrive_and_wait();
  const auto begun = std::chrono::steady_clock::now();
  for (std::thread &thread : running) {
    thread.join();
  }
  const std::chrono::duration<double, std::nano> time = std::chrono::steady_clock::now() - begun;
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
