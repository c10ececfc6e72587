// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PublishedToken`, the token that readers copy without a lock.

#pragma once

#include <ssoclient/saml_token.h>

#include <atomic>
#include <cstdint>
#include <memory>

namespace SsoClient {

/// A token and the time in which it may be returned without a further check. Any number of threads read it, and no
/// reader waits for another one. A reader increments the count in the word that has the address of the token, copies
/// the token, and decrements the count. The writer replaces the word and takes over its count. The last user of the old
/// token releases it.
///
/// Times are microseconds since 1970, UTC.
class PublishedToken {
public:
  PublishedToken() noexcept = default;
  PublishedToken(const PublishedToken &) = delete;
  PublishedToken &operator=(const PublishedToken &) = delete;
  ~PublishedToken();

  /// The token, if `now` is neither before `from` nor at or after `until`, otherwise null. Any thread.
  std::shared_ptr<const SamlToken> Read(std::int64_t now) const noexcept;

  /// Makes readers find `token`. One thread at a time calls this and the functions below.
  /// @param token not null
  /// @throws std::bad_alloc; nothing has changed then
  void Publish(std::shared_ptr<const SamlToken> token, std::int64_t from, std::int64_t until);

  /// Changes the end of the time of the published token, if there is one.
  void SetUntil(std::int64_t until) noexcept;

  /// Makes readers find nothing.
  void Clear() noexcept;

private:
  struct Node;

  static std::uint64_t ToWord(const Node *node) noexcept;
  static Node *ToNode(std::uint64_t word) noexcept;
  void CountOut(Node *node) const noexcept;
  void Exchange(Node *node) noexcept;

  mutable std::atomic<std::uint64_t> m_word{0}; // address of the node and number of readers
  Node *m_node = nullptr;                       // the same address, where tools that search for leaks see it
};

} // namespace SsoClient
