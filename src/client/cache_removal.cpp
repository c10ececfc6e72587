// SPDX-License-Identifier: Apache-2.0

#include "client/cache_removal.h"

#include <ssoclient/logger.h>

#include <utility>

namespace SsoClient {

namespace {

constexpr std::chrono::milliseconds LOCK_STEP{20};
constexpr int LOG_LEVEL_WARNING = 8;

void Log(const char *reason) noexcept {
  try {
    Tarvel::Service::LogInternal(getLogger(), LOG_LEVEL_WARNING, "The token was not removed from the cache: %1",
                                 reason);
  } catch (...) {
    // No memory: the line is lost.
  }
}

/// Tries again until it has the lock, or until the file does not have the token, at most for the time of one attempt:
/// another program may have the lock as long.
class Removal : public std::enable_shared_from_this<Removal> {
public:
  Removal(std::shared_ptr<const RefreshSupplies> supplies, std::string tokenId)
      : m_supplies(std::move(supplies)), m_tokenId(std::move(tokenId)),
        m_deadline(m_supplies->time.GetSteadyTime() + m_supplies->timeout) {}

  void Queue() noexcept {
    try {
      m_supplies->blocking([self = shared_from_this()] { self->Run(); });
    } catch (const std::exception &exception) {
      Log(exception.what());
    }
  }

private:
  void Run() noexcept {
    try {
      const TokenCacheFile &cache = *m_supplies->cache;
      if (!cache.Contains(m_tokenId)) {
        return;
      }
      if (const std::unique_ptr<TokenCacheFile::Lock> lock = cache.TryLockExisting()) {
        cache.Remove(*lock, m_tokenId);
        return;
      }
      const auto now = m_supplies->time.GetSteadyTime();
      if (now >= m_deadline) {
        Log("another program has locked the file");
        return;
      }
      m_supplies->time.StartTimer(now + LOCK_STEP, [self = shared_from_this()] { self->Queue(); });
    } catch (const std::exception &exception) {
      Log(exception.what());
    }
  }

  const std::shared_ptr<const RefreshSupplies> m_supplies;
  const std::string m_tokenId;
  const TimeSource::SteadyClock::time_point m_deadline;
};

} // namespace

void RemoveFromCache(const std::shared_ptr<const RefreshSupplies> &supplies, const std::string &tokenId) noexcept {
  try {
    std::make_shared<Removal>(supplies, tokenId)->Queue();
  } catch (const std::exception &exception) {
    Log(exception.what());
  }
}

} // namespace SsoClient
