// SPDX-License-Identifier: Apache-2.0

#include "system/background_thread.h"

#include <tarvel/core/exception.h>

#include <csignal>
#include <pthread.h>
#include <string>
#include <system_error>
#include <utility>

namespace Tarvel::System {

namespace {

/// Blocks signals on the calling thread. A new thread inherits the mask, so there is no moment at which a signal could
/// reach it.
class ScopedSignalMask {
public:
  ScopedSignalMask() noexcept {
    sigset_t blocked;
    sigfillset(&blocked);
    // If these were blocked, a fault would end the process without calling the host's crash handler.
    for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGTRAP, SIGSYS}) {
      sigdelset(&blocked, fault);
    }
    pthread_sigmask(SIG_SETMASK, &blocked, &m_earlier);
  }
  ScopedSignalMask(const ScopedSignalMask &) = delete;
  ScopedSignalMask &operator=(const ScopedSignalMask &) = delete;
  ~ScopedSignalMask() { pthread_sigmask(SIG_SETMASK, &m_earlier, nullptr); }

private:
  sigset_t m_earlier{};
};

} // namespace

std::thread StartBackgroundThread(const char *name, std::function<void()> body) {
  const ScopedSignalMask mask;
  try {
    std::thread thread(std::move(body));
    pthread_setname_np(thread.native_handle(), name);
    return thread;
  } catch (const std::system_error &error) {
    throw InvalidStateException(std::string("Cannot start a thread: ") + error.code().message());
  }
}

} // namespace Tarvel::System
