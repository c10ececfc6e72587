// SPDX-License-Identifier: Apache-2.0

#include "client/credential_requests.h"

#include <mutex>
#include <utility>

namespace SsoClient {

CredentialRequests::CredentialRequests(CredentialProvider provider, Executor blocking)
    : m_provider(std::move(provider)), m_blocking(std::move(blocking)) {}

void CredentialRequests::Request(Callback callback) {
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (m_isClosed) {
      return;
    }
    std::swap(m_waiting, callback); // the earlier one is destroyed outside the lock
    if (m_isCalling) {
      return;
    }
    m_isCalling = true;
  }
  try {
    m_blocking([self = shared_from_this()] { self->Call(); });
  } catch (...) {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    std::swap(m_waiting, callback);
    m_isCalling = false;
    throw;
  }
}

bool CredentialRequests::IsClosed() noexcept {
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  return m_isClosed;
}

void CredentialRequests::Call() noexcept {
  if (IsClosed()) {
    return; // this thread was late, and the host may have destroyed what the provider refers to
  }
  Outcome<std::shared_ptr<const Credential>> outcome{std::exception_ptr()};
  try {
    outcome = std::make_shared<const Credential>(m_provider());
  } catch (...) {
    outcome = std::current_exception();
  }
  Callback callback;
  {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    callback = std::exchange(m_waiting, nullptr);
    m_isCalling = false;
  }
  if (callback) {
    callback(outcome);
  }
}

void CredentialRequests::Close() noexcept {
  Callback dropped; // destroyed outside the lock
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  m_isClosed = true;
  std::swap(dropped, m_waiting);
}

void CredentialRequests::ForgetCall() noexcept {
  const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
  m_isCalling = false;
}

} // namespace SsoClient
