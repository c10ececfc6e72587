// SPDX-License-Identifier: Apache-2.0

#include "shutdown.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <stdexcept>

#include <poll.h>
#include <sys/signalfd.h>
#include <unistd.h>

namespace DevSts {

EndSignals::EndSignals() : m_descriptor(-1) {
  std::signal(SIGPIPE, SIG_IGN); // a client that closes its connection must not end the service
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  m_descriptor = sigprocmask(SIG_BLOCK, &signals, nullptr) == 0 ? signalfd(-1, &signals, SFD_CLOEXEC) : -1;
  if (m_descriptor < 0) {
    throw std::runtime_error("signals cannot be caught");
  }
}

EndSignals::~EndSignals() {
  close(m_descriptor);
}

void EndSignals::Wait(bool untilEof) const {
  std::array<pollfd, 2> waiting{{{m_descriptor, POLLIN, 0}, {untilEof ? STDIN_FILENO : -1, POLLIN, 0}}};
  for (;;) {
    if (poll(waiting.data(), waiting.size(), -1) < 0 && errno != EINTR) {
      throw std::runtime_error("cannot wait for signals");
    }
    if (waiting[0].revents != 0) {
      return;
    }
    std::array<char, 4096> dropped;
    if (waiting[1].revents != 0 && read(STDIN_FILENO, dropped.data(), dropped.size()) <= 0) {
      return;
    }
  }
}

} // namespace DevSts
