// SPDX-License-Identifier: Apache-2.0

#include "unit/operation/counted_work.h"

#include "support/refused_memory.h"

#include <ctime>
#include <limits>

#include <sys/syscall.h>
#include <unistd.h>

namespace Testing {

namespace {

constexpr long NEVER = std::numeric_limits<long>::max();

thread_local CountedWork g_work;
thread_local long g_firstFailing = NEVER; // the numbers of the allocations that fail
thread_local long g_lastFailing = NEVER;

} // namespace

bool IsMemoryRefused() noexcept {
  ++g_work.allocations;
  return g_work.allocations >= g_firstFailing && g_work.allocations <= g_lastFailing && g_firstFailing != NEVER;
}

CountedWork CountWork() noexcept {
  return g_work;
}

FailingAllocations::FailingAllocations(long n, bool failsOnce) noexcept {
  g_firstFailing = g_work.allocations + n;
  g_lastFailing = failsOnce ? g_firstFailing : NEVER;
}

FailingAllocations::~FailingAllocations() {
  g_firstFailing = NEVER;
}

} // namespace Testing

#ifndef TESTING_IS_SANITIZED
#pragma GCC visibility push(default)
// Replaces the C library's function, which the standard clocks call.
extern "C" int clock_gettime(clockid_t clock, timespec *time) noexcept {
  ++Testing::g_work.clockReads;
  return static_cast<int>(syscall(SYS_clock_gettime, clock, time));
}
#pragma GCC visibility pop
#endif
