// SPDX-License-Identifier: Apache-2.0

#include "system/shared_lookup.h"

#include "core/fork_gate.h"
#include "system/thread_pool.h"

#include <tarvel/core/string_util.h>
#include <tarvel/system/stream.h>

#include <atomic>
#include <chrono>
#include <iterator>
#include <list>
#include <map>
#include <memory>
#include <mutex>
#include <utility>

namespace Tarvel::System {

namespace {

constexpr std::chrono::milliseconds LOOKUP_IDLE_TIME{500};

class Asker;
using AskerList = std::list<Ref<Asker>>;

/// A look-up that runs or waits for a thread. Guarded by the registry's mutex.
struct Lookup {
  std::string name; // in lower case
  AskerList askers;
  Ref<ScheduledItem> work;
  bool hasBegun = false;
};

struct Registry {
  const Ref<ThreadPool> pool = CreateEndlessThreadPool(MAX_NAME_LOOKUPS, LOOKUP_IDLE_TIME, "tarvel-lookup");
  ForkSafeMutex mutex;                                    // never held while a completion runs
  std::map<std::string, std::shared_ptr<Lookup>> lookups; // guarded by mutex; by name
  unsigned generation = GetForkGeneration();              // guarded by mutex; of the process that started the look-ups
};

Registry &GetRegistry() {
  const Computation computing;
  static Registry *const registry = new Registry; // never destroyed: a look-up cannot be interrupted
  return *registry;
}

/// Called under the registry's lock.
void Forget(Registry &registry, const Lookup &lookup) {
  const auto found = registry.lookups.find(lookup.name);
  if (found != registry.lookups.end() && found->second.get() == &lookup) { // otherwise `lookup` is a parent's
    registry.lookups.erase(found);
  }
}

/// One caller's part in a look-up.
class Asker final : public ScheduledItem {
public:
  explicit Asker(LookupCompletion completion) : m_completion(std::move(completion)) {}

  void Cancel() noexcept override {
    const Ref<Asker> self(this); // the look-up's reference may be the last
    LookupCompletion completion; // destroyed outside the lock: it may own any object
    Ref<ScheduledItem> neverToRun;
    Registry &registry = GetRegistry();
    {
      const std::lock_guard<ForkSafeMutex> lock(registry.mutex);
      const std::shared_ptr<Lookup> lookup = std::move(m_lookup);
      if (!lookup) {
        return;
      }
      lookup->askers.erase(m_place);
      completion.swap(m_completion);
      if (lookup->askers.empty() && !lookup->hasBegun) {
        Forget(registry, *lookup);
        neverToRun = lookup->work;
      }
    }
    m_isDone = true;
    if (neverToRun) {
      neverToRun->Cancel();
    }
  }

  bool IsDone() const noexcept override { return m_isDone; }

  /// Records this caller's place in the look-up's list. Called under the registry's lock.
  void SetPlace(std::shared_ptr<Lookup> lookup, AskerList::iterator place) noexcept {
    m_lookup = std::move(lookup);
    m_place = place;
  }

  /// After this, `Cancel` does nothing. Called under the registry's lock.
  void ForgetPlace() noexcept { m_lookup.reset(); }

  /// Called once, after `ForgetPlace`.
  void Complete(const AddressList &addresses, const std::exception_ptr &failure) {
    m_completion(addresses, failure);
    m_completion = nullptr;
    m_isDone = true;
  }

private:
  ~Asker() override = default;

  LookupCompletion m_completion;
  std::shared_ptr<Lookup> m_lookup; // guarded by the registry's mutex; null when this no longer waits
  AskerList::iterator m_place;      // in m_lookup
  std::atomic<bool> m_isDone{false};
};

/// Marks the look-up as begun. @return whether a caller still waits for it.
bool Begin(Lookup &lookup) {
  const std::lock_guard<ForkSafeMutex> lock(GetRegistry().mutex);
  lookup.hasBegun = true;
  return !lookup.askers.empty();
}

/// Removes the look-up from the registry, so that later callers start another one.
/// @return the callers that wait for it.
AskerList End(Lookup &lookup) {
  Registry &registry = GetRegistry();
  const std::lock_guard<ForkSafeMutex> lock(registry.mutex);
  Forget(registry, lookup);
  for (const Ref<Asker> &asker : lookup.askers) {
    asker->ForgetPlace();
  }
  return std::move(lookup.askers);
}

void Run(Lookup &lookup, const std::string &host) {
  if (!Begin(lookup)) {
    return;
  }
  AddressList addresses;
  std::exception_ptr failure;
  try {
    addresses = LookUpName(host);
  } catch (...) {
    failure = std::current_exception();
  }
  for (const Ref<Asker> &asker : End(lookup)) {
    asker->Complete(addresses, failure);
  }
}

/// Starts a look-up for `asker`. Called under the registry's lock; the look-up begins only after the lock is released.
std::shared_ptr<Lookup> StartLookup(Registry &registry, const std::string &host, const std::string &name,
                                    const Ref<Asker> &asker) {
  auto lookup = std::make_shared<Lookup>();
  lookup->name = name;
  lookup->askers.push_back(asker);
  const auto place = registry.lookups.emplace(name, lookup).first;
  try {
    lookup->work = registry.pool->QueueWorkItem([lookup, host] { Run(*lookup, host); });
  } catch (...) {
    registry.lookups.erase(place);
    throw;
  }
  return lookup;
}

/// In a child process: removes the look-ups of its parent, which never end here. Called under the registry's lock.
/// @return the callers that wait for them. They must be destroyed after the lock is released, and are never called.
AskerList RemoveLookupsOfParent(Registry &registry) {
  AskerList askers;
  if (std::exchange(registry.generation, GetForkGeneration()) == GetForkGeneration()) {
    return askers;
  }
  for (const auto &[name, lookup] : registry.lookups) {
    for (const Ref<Asker> &asker : lookup->askers) {
      asker->ForgetPlace();
    }
    askers.splice(askers.end(), lookup->askers);
  }
  registry.lookups.clear();
  return askers;
}

} // namespace

Ref<ScheduledItem> StartSharedLookup(const std::string &host, LookupCompletion completion) {
  const auto asker = MakeRef<Asker>(std::move(completion));
  const std::string name = StringUtil::ToLower(host);
  Registry &registry = GetRegistry();
  AskerList ofParent;
  const std::lock_guard<ForkSafeMutex> lock(registry.mutex);
  ofParent = RemoveLookupsOfParent(registry);
  const auto found = registry.lookups.find(name);
  std::shared_ptr<Lookup> lookup;
  if (found == registry.lookups.end()) {
    lookup = StartLookup(registry, host, name, asker);
  } else {
    lookup = found->second;
    lookup->askers.push_back(asker);
  }
  asker->SetPlace(lookup, std::prev(lookup->askers.end()));
  return asker;
}

} // namespace Tarvel::System
