// SPDX-License-Identifier: Apache-2.0

#include "interruption.h"

#include "exit_code.h"

#include <pthread.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

constexpr int ENDING_SIGNALS[] = {SIGINT, SIGTERM, SIGHUP, SIGQUIT};

// What the handler restores. The handler runs only on the main thread, which blocks signals while it changes these.
volatile std::sig_atomic_t g_isQuiet = 0;
int g_terminal = -1;
termios g_earlierSettings;

void RestoreTerminal() noexcept {
  if (g_isQuiet) {
    g_isQuiet = 0;
    // Drops what has been typed so far: the program that next reads the terminal must not get the rest of a password.
    tcsetattr(g_terminal, TCSAFLUSH, &g_earlierSettings);
  }
}

extern "C" void EndAtSignal(int signal) {
  RestoreTerminal();
  if (signal == SIGINT) {
    _exit(static_cast<int>(ExitCode::INTERRUPTED));
  }
  // The handler was reset when it was called, so this ends the process as if there were no handler.
  raise(signal);
}

sigset_t EndingAndStopping() noexcept {
  sigset_t set;
  sigemptyset(&set);
  for (const int signal : ENDING_SIGNALS) {
    sigaddset(&set, signal);
  }
  sigaddset(&set, SIGTSTP);
  return set;
}

} // namespace

void CatchEndingSignals() {
  for (const int signal : ENDING_SIGNALS) {
    struct sigaction previous = {};
    // A shell starts background jobs with SIGINT ignored; it must stay ignored.
    if (sigaction(signal, nullptr, &previous) == 0 && previous.sa_handler != SIG_IGN) {
      struct sigaction action = {};
      action.sa_handler = EndAtSignal;
      action.sa_flags = static_cast<int>(SA_RESETHAND);
      sigaction(signal, &action, nullptr);
    }
  }
  // Ignored so that a file beyond the process's size limit is a write error, after which the file is cleaned up.
  std::signal(SIGXFSZ, SIG_IGN);
}

SignalsHeldBack::SignalsHeldBack() noexcept {
  const sigset_t held = EndingAndStopping();
  pthread_sigmask(SIG_BLOCK, &held, &m_earlier);
}

SignalsHeldBack::~SignalsHeldBack() {
  pthread_sigmask(SIG_SETMASK, &m_earlier, nullptr);
}

QuietTerminal::QuietTerminal(int descriptor) noexcept {
  sigset_t stopping;
  sigemptyset(&stopping);
  sigaddset(&stopping, SIGTSTP);
  pthread_sigmask(SIG_BLOCK, &stopping, &m_earlierMask);

  const SignalsHeldBack held;
  m_isTerminal = tcgetattr(descriptor, &g_earlierSettings) == 0;
  if (!m_isTerminal) {
    return;
  }
  termios quiet = g_earlierSettings;
  quiet.c_lflag &= ~static_cast<tcflag_t>(ECHO);
  quiet.c_lflag |= ECHONL;
  g_terminal = descriptor;
  g_isQuiet = 1;
  tcsetattr(descriptor, TCSAFLUSH, &quiet);
}

QuietTerminal::~QuietTerminal() {
  {
    const SignalsHeldBack held;
    RestoreTerminal();
  }
  pthread_sigmask(SIG_SETMASK, &m_earlierMask, nullptr);
}

} // namespace SsoClient::Tool
