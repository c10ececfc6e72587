// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/environment.h>

#include "core/current_environment.h"

#include <atomic>
#include <utility>

namespace Tarvel {

namespace {

std::atomic<const Environment *> current{nullptr};

} // namespace

const Environment *CurrentEnvironment() noexcept {
  return current.load(std::memory_order_acquire);
}

ScopedEnvironment::ScopedEnvironment(Environment environment)
    : m_environment(new Environment(std::move(environment))),
      m_previous(current.exchange(m_environment, std::memory_order_acq_rel)) {}

ScopedEnvironment::~ScopedEnvironment() {
  current.store(m_previous, std::memory_order_release);
  delete m_environment;
}

} // namespace Tarvel
