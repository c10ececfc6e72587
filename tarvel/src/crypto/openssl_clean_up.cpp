// SPDX-License-Identifier: Apache-2.0

#include "crypto/openssl_clean_up.h"

#include "core/fork_gate.h"

#include <mutex>

namespace Tarvel::Crypto {

namespace {

// Constant-initialised and never destroyed.
ForkSafeMutex mutex;                   // guards the list
OpenSslCleanUpNotice *first = nullptr; // the newest

} // namespace

OpenSslCleanUpNotice::OpenSslCleanUpNotice(Function function, void *owner) noexcept
    : m_function(function), m_owner(owner) {
  const std::lock_guard<ForkSafeMutex> lock(mutex);
  m_next = first;
  if (m_next) {
    m_next->m_previous = this;
  }
  first = this;
}

void OpenSslCleanUpNotice::Withdraw() noexcept {
  const std::lock_guard<ForkSafeMutex> lock(mutex);
  if (first == this) {
    first = m_next;
  }
  if (m_previous) {
    m_previous->m_next = m_next;
  }
  if (m_next) {
    m_next->m_previous = m_previous;
  }
  m_previous = m_next = nullptr;
}

void OpenSslCleanUpNotice::CallAll() noexcept {
  const std::lock_guard<ForkSafeMutex> lock(mutex);
  while (OpenSslCleanUpNotice *const notice = first) {
    first = notice->m_next;
    if (first) {
      first->m_previous = nullptr;
    }
    notice->m_next = nullptr;
    if (notice->m_generation == GetForkGeneration()) {
      notice->m_function(notice->m_owner);
    }
  }
}

} // namespace Tarvel::Crypto
