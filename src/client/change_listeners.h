// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ChangeListeners`, the functions that a source calls with each new token.

#pragma once

#include <ssoclient/client/token_source.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <functional>
#include <list>
#include <memory>
#include <utility>
#include <vector>

namespace SsoClient {

/// Calls the functions one at a time and in order: the tokens in the order in which they were published, the functions for each
/// token in the order in which they were registered. Safe on any thread.
class ChangeListeners : public std::enable_shared_from_this<ChangeListeners> {
public:
  using Function = std::function<void(const std::shared_ptr<const SamlToken> &token)>;

  /// @param executor where the functions run
  explicit ChangeListeners(Executor executor);

  /// Registers `function` until the returned object is destroyed.
  std::shared_ptr<void> Add(Function function);

  /// Queues a call of each registered function with `token`. Calls nothing, so the caller may hold its own lock.
  /// @return whether the caller must call `ScheduleNext`
  /// @throws std::bad_alloc
  bool Queue(const std::shared_ptr<const SamlToken> &token);

  /// Makes the next queued call on the executor. The caller holds no lock.
  void ScheduleNext() noexcept;

  /// Starts no further call. A call that is under way continues.
  void Close() noexcept;

  /// In a child of `fork`: drops the calls of the parent.
  void ForgetCalls() noexcept;

private:
  using Entry = std::weak_ptr<const Function>;
  using Call = std::pair<Entry, std::shared_ptr<const SamlToken>>;

  void RunNext();

  const Executor m_executor;
  Tarvel::ForkSafeMutex m_mutex; // guards all that follows
  std::vector<Entry> m_entries;
  std::list<Call> m_calls;
  bool m_isRunning = false;
  bool m_isClosed = false;
};

} // namespace SsoClient
