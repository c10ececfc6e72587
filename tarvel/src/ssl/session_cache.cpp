// SPDX-License-Identifier: Apache-2.0

#include "ssl/session_cache.h"

#include "crypto/openssl_guard.h"

#include <ctime>
#include <iterator>
#include <mutex>
#include <utility>

namespace Tarvel::Ssl {

namespace {

constexpr std::size_t MAX_SESSIONS = 512;
/// This many connections to one endpoint can be open at the same time, each with a resumed session.
constexpr std::size_t MAX_SESSIONS_PER_KEY = 64;

/// Whether the session can be resumed and its server's certificate has not expired, which a resumed handshake does not
/// check.
bool IsUsable(const SSL_SESSION *session) {
  if (SSL_SESSION_is_resumable(session) != 1) {
    return false;
  }
  const long age = static_cast<long>(std::time(nullptr)) - SSL_SESSION_get_time(session);
  if (age < 0 || age >= SSL_SESSION_get_timeout(session)) {
    return false;
  }
  // The function only reads the session, although its parameter is not const.
  const X509 *const certificate = SSL_SESSION_get0_peer(const_cast<SSL_SESSION *>(session));
  return certificate && X509_cmp_current_time(X509_get0_notAfter(certificate)) > 0;
}

} // namespace

void SessionCache::Put(const std::string &key, SessionHandle session) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  ForgetSessionsOfParent();
  Entries entry;
  entry.push_back(Entry{key, std::move(session)});
  m_byKey.emplace(key, entry.begin());
  m_entries.splice(m_entries.end(), entry); // never throws: if memory runs out, neither container has the session
  if (m_byKey.count(key) > MAX_SESSIONS_PER_KEY) {
    const auto oldest = m_byKey.lower_bound(key);
    m_entries.erase(oldest->second);
    m_byKey.erase(oldest);
  }
  if (m_entries.size() > MAX_SESSIONS) {
    m_byKey.erase(m_byKey.lower_bound(m_entries.front().key)); // the first entry is the oldest of all
    m_entries.pop_front();
  }
}

SessionHandle SessionCache::Take(const std::string &key) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  ForgetSessionsOfParent();
  for (auto end = m_byKey.upper_bound(key); end != m_byKey.lower_bound(key); end = m_byKey.upper_bound(key)) {
    const auto newest = std::prev(end);
    SessionHandle session = std::move(newest->second->session);
    m_entries.erase(newest->second);
    m_byKey.erase(newest);
    if (IsUsable(session.get())) {
      return session;
    }
  }
  return {};
}

void SessionCache::Abandon() noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  for (Entry &entry : m_entries) {
    Crypto::OpenSslGuard::Abandon(entry.session.release());
  }
}

std::size_t SessionCache::GetSize() {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  ForgetSessionsOfParent();
  return m_entries.size();
}

void SessionCache::ForgetSessionsOfParent() {
  if (std::exchange(m_generation, GetForkGeneration()) != GetForkGeneration()) {
    m_byKey.clear();
    m_entries.clear();
  }
}

void SessionCache::Clear() {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  m_byKey.clear();
  m_entries.clear();
}

} // namespace Tarvel::Ssl
