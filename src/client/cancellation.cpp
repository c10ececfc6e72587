// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/cancellation.h>

#include "operation/caught_exception.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <atomic>
#include <list>
#include <mutex>

namespace SsoClient {

namespace {

void Call(const std::function<void()> &function) noexcept {
  try {
    function();
  } catch (...) {
    LogCaughtException("", "A function of CancelToken::OnCancel", SecretMask());
  }
}

} // namespace

class CancelState {
public:
  /// In which processes a function is called. The operations of a parent do not exist in its children.
  enum class Calls { IN_THIS_PROCESS, IN_CHILDREN_TOO };

  bool IsCancelled() const noexcept { return m_isCancelled.load(std::memory_order_acquire); }

  /// Calls `function` when this is cancelled, unless the registration is destroyed before that.
  static CancelRegistration Register(const std::shared_ptr<CancelState> &state, Calls calls,
                                     std::function<void()> function);

  void Cancel() noexcept {
    {
      const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
      if (m_isCancelled.exchange(true, std::memory_order_acq_rel)) {
        return;
      }
    }
    while (CallFirst()) {
    }
  }

private:
  /// A registered function. The registration owns it.
  struct Entry : std::enable_shared_from_this<Entry> {
    Entry() = default;
    Entry(const Entry &) = delete;
    Entry &operator=(const Entry &) = delete;
    ~Entry() { state->Remove(*this); }

    bool IsToBeCalledHere() const noexcept {
      return calls == Calls::IN_CHILDREN_TOO || generation == Tarvel::GetForkGeneration();
    }

    std::shared_ptr<CancelState> state;
    Calls calls = Calls::IN_THIS_PROCESS;
    unsigned generation = Tarvel::GetForkGeneration();
    std::function<void()> function;
    bool isListed = false;              // guarded by the state's mutex
    std::list<Entry *>::iterator place; // while it is listed; guarded by the state's mutex
  };

  /// @return false when this has been cancelled.
  bool Add(Entry &entry) {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (IsCancelled()) {
      return false;
    }
    entry.place = m_entries.insert(m_entries.end(), &entry);
    entry.isListed = true;
    return true;
  }

  void Remove(Entry &entry) noexcept {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (entry.isListed) {
      m_entries.erase(entry.place);
    }
  }

  /// Calls the function of the first entry, if its registration is not being destroyed. @return false when there is no
  /// entry.
  bool CallFirst() noexcept {
    std::shared_ptr<Entry> entry; // its destructor takes the lock
    {
      const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
      if (m_entries.empty()) {
        return false;
      }
      Entry &first = *m_entries.front();
      m_entries.pop_front();
      first.isListed = false;
      entry = first.weak_from_this().lock();
    }
    if (entry && entry->IsToBeCalledHere()) {
      // What the function captures is released after the call, because it may own the registration.
      Call(std::exchange(entry->function, nullptr));
    }
    return true;
  }

  Tarvel::ForkSafeMutex m_mutex;
  std::atomic<bool> m_isCancelled{false}; // set under m_mutex
  std::list<Entry *> m_entries;           // guarded by m_mutex
};

CancelRegistration CancelState::Register(const std::shared_ptr<CancelState> &state, Calls calls,
                                         std::function<void()> function) {
  const auto entry = std::make_shared<Entry>();
  entry->state = state;
  entry->calls = calls;
  entry->function = std::move(function);
  if (!state->Add(*entry)) {
    Call(entry->function);
    return {};
  }
  return CancelRegistration(entry);
}

namespace {

/// Cancels its source when either of two tokens is cancelled.
struct EitherToken {
  /// @param either shared by its tokens only
  static CancelRegistration Link(const std::shared_ptr<CancelState> &state,
                                 const std::shared_ptr<EitherToken> &either) {
    return CancelState::Register(state, CancelState::Calls::IN_CHILDREN_TOO,
                                 [watched = std::weak_ptr<EitherToken>(either)] {
                                   if (const std::shared_ptr<EitherToken> shared = watched.lock()) {
                                     shared->source.Cancel();
                                   }
                                 });
  }

  CancelSource source;
  CancelRegistration first;
  CancelRegistration second;
};

} // namespace

CancelToken CancelToken::AnyOf(const CancelToken &first, const CancelToken &second) {
  if (!first.m_state || !second.m_state) {
    return first.m_state ? first : second;
  }
  const auto either = std::make_shared<EitherToken>();
  either->first = EitherToken::Link(first.m_state, either);
  either->second = EitherToken::Link(second.m_state, either);
  return CancelToken(std::shared_ptr<CancelState>(either, either->source.GetToken().m_state.get()));
}

bool CancelToken::IsCancelled() const noexcept {
  return m_state && m_state->IsCancelled();
}

CancelRegistration CancelToken::OnCancel(std::function<void()> function) const {
  if (!function) {
    throw Tarvel::InvalidArgumentException("the function of CancelToken::OnCancel is empty");
  }
  if (!m_state) {
    return {};
  }
  return CancelState::Register(m_state, CancelState::Calls::IN_THIS_PROCESS, std::move(function));
}

CancelSource::CancelSource() : m_state(std::make_shared<CancelState>()) {}

void CancelSource::Cancel() const noexcept {
  const std::shared_ptr<CancelState> state = m_state; // a function may destroy this source
  state->Cancel();
}

bool CancelSource::IsCancelled() const noexcept {
  return m_state->IsCancelled();
}

} // namespace SsoClient
