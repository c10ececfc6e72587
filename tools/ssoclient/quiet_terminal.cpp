// SPDX-License-Identifier: Apache-2.0

#include "quiet_terminal.h"

#include <mutex>

#include <pthread.h>
#include <termios.h>

namespace SsoClient::Tool {
namespace {

std::mutex g_mutex; // protects what follows
bool g_isQuiet = false;
int g_terminal = -1;
termios g_earlierSettings;

/// Discards what has been typed so far: the program that reads the terminal next must not get the rest of a password.
/// Does not wait until the terminal has shown all output, because its output may have been stopped.
void Apply(int terminal, const termios &settings) noexcept {
  tcsetattr(terminal, TCSANOW, &settings);
  tcflush(terminal, TCIFLUSH);
}

void EchoAgain() noexcept {
  if (g_isQuiet) {
    g_isQuiet = false;
    Apply(g_terminal, g_earlierSettings);
  }
}

} // namespace

QuietTerminal::QuietTerminal(int descriptor) noexcept {
  sigset_t stopping;
  sigemptyset(&stopping);
  sigaddset(&stopping, SIGTSTP);
  pthread_sigmask(SIG_BLOCK, &stopping, &m_earlierMask);

  const std::lock_guard<std::mutex> lock(g_mutex);
  m_isTerminal = tcgetattr(descriptor, &g_earlierSettings) == 0;
  if (!m_isTerminal) {
    return;
  }
  termios quiet = g_earlierSettings;
  quiet.c_lflag &= ~static_cast<tcflag_t>(ECHO);
  quiet.c_lflag |= ECHONL;
  g_terminal = descriptor;
  g_isQuiet = true;
  Apply(descriptor, quiet);
}

QuietTerminal::~QuietTerminal() {
  {
    const std::lock_guard<std::mutex> lock(g_mutex);
    EchoAgain();
  }
  pthread_sigmask(SIG_SETMASK, &m_earlierMask, nullptr);
}

void RestoreTerminal() noexcept {
  g_mutex.lock();
  EchoAgain();
}

} // namespace SsoClient::Tool
