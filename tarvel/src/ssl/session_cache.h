// SPDX-License-Identifier: Apache-2.0
/// @file
/// The TLS sessions that may be resumed.

#pragma once

#include "core/fork_gate.h"
#include "ssl/ssl_handles.h"

#include <cstddef>
#include <list>
#include <map>
#include <string>

namespace Tarvel::Ssl {

/// Recent sessions by key. The key contains the endpoint and everything that its certificate was checked for, because a
/// resumed handshake does not verify the certificate again. Safe on any thread.
class SessionCache {
public:
  SessionCache() = default;
  SessionCache(const SessionCache &) = delete;
  SessionCache &operator=(const SessionCache &) = delete;

  /// Adds `session`. When there are too many, the oldest is removed.
  void Put(const std::string &key, SessionHandle session);

  /// Removes and returns the newest usable session; null when there is none. So two connections never use a session at
  /// the same time, and a ticket of TLS 1.3 is used only once (RFC 8446, appendix C.4).
  SessionHandle Take(const std::string &key);

  void Clear();

  /// Forgets the sessions without freeing them. Called after OpenSSL has cleaned itself up.
  void Abandon() noexcept;

  std::size_t GetSize();

private:
  struct Entry {
    std::string key;
    SessionHandle session;
  };
  using Entries = std::list<Entry>;

  /// Must be called under the lock. A child process begins with an empty cache, because only the parent uses the
  /// parent's sessions.
  void ForgetSessionsOfParent();

  mutable ForkSafeMutex m_mutex;                         // guards all members below
  unsigned m_generation = GetForkGeneration();           // of the process that the entries belong to
  Entries m_entries;                                     // oldest first
  std::multimap<std::string, Entries::iterator> m_byKey; // within a key, oldest first
};

} // namespace Tarvel::Ssl
