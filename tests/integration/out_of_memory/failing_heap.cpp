// SPDX-License-Identifier: Apache-2.0

#include "integration/out_of_memory/failing_heap.h"

#include "crypto/recent_certificates.h"

#include "support/refused_memory.h"

#include <limits>

namespace Testing {

namespace {

constexpr long NEVER = std::numeric_limits<long>::max();

thread_local long t_allocationsLeft = NEVER; // before the one that fails
thread_local Shortage t_shortage = Shortage::ONCE;
thread_local bool t_hasFailed = false;

} // namespace

bool IsMemoryRefused() noexcept {
  if (t_allocationsLeft == NEVER || t_allocationsLeft-- > 0) {
    return false;
  }
  t_allocationsLeft = t_shortage == Shortage::ONCE ? NEVER : 0;
  t_hasFailed = true;
  return true;
}

FailingHeap::FailingHeap(long allocations, Shortage shortage) noexcept {
  Tarvel::Crypto::ForgetRecentCertificates(); // so that decoding certificates can fail, too
  t_hasFailed = false;
  t_shortage = shortage;
  t_allocationsLeft = allocations;
}

FailingHeap::~FailingHeap() {
  End();
}

void FailingHeap::End() noexcept {
  t_allocationsLeft = NEVER;
}

bool FailingHeap::HasFailed() const noexcept {
  return t_hasFailed;
}

long CountHeapAllocations() noexcept {
  return t_liveAllocations;
}

} // namespace Testing
