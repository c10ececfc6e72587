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

/// A new thread inherits the mask of the one that starts it, so that it has no moment at which a signal could hit it.
class ScopedSignalMask {
public:
  ScopedSignalMask() noexcept {
    sigset_t blocked;
    sigfillset(&blocked);
    // A blocked fault would end the process without the host's crash handler being asked.
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
