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

/// Recent sessions by key. The key names the endpoint and all that its certificate was checked for, since a resumed
/// session is not checked again. Safe on any thread.
class SessionCache {
public:
  SessionCache() = default;
  SessionCache(const SessionCache &) = delete;
  SessionCache &operator=(const SessionCache &) = delete;

  /// Keeps `session`, in place of the longest unused one when there are too many.
  void Put(const std::string &key, SessionHandle session);

  /// Takes the newest usable session out: each is used once at a time, and a ticket of TLS 1.3 once at all (RFC 8446,
  /// appendix C.4). Null when there is none.
  SessionHandle Take(const std::string &key);

  void Clear();

  /// Forgets the sessions without freeing them, once OpenSSL is gone.
  void Abandon() noexcept;

  std::size_t GetSize();

private:
  struct Entry {
    std::string key;
    SessionHandle session;
  };
  using Entries = std::list<Entry>;

  /// Under the lock: a child begins with none, for what its parent has is its parent's to use.
  void ForgetThoseOfParent();

  mutable ForkSafeMutex m_mutex;                         // guards all that follows
  unsigned m_generation = GetForkGeneration();           // of the process that the entries belong to
  Entries m_entries;                                     // the oldest first
  std::multimap<std::string, Entries::iterator> m_byKey; // within a key, the oldest first
};

} // namespace Tarvel::Ssl
