// SPDX-License-Identifier: Apache-2.0

#include "terminal.h"

#include "process.h"

#include <array>
#include <csignal>
#include <stdexcept>

#include <poll.h>
#include <pty.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>
#include <utmp.h>

namespace ToolTest {
namespace {

constexpr int PATIENCE_MS = 30000;
constexpr int TURN_MS = 10;

} // namespace

TerminalSession::TerminalSession(std::vector<std::string> words, const std::string &folder) {
  std::vector<char *> raw;
  for (std::string &word : words) {
    raw.push_back(word.data());
  }
  raw.push_back(nullptr);
  if (openpty(&m_master, &m_slave, nullptr, nullptr, nullptr) != 0) {
    throw std::runtime_error("openpty");
  }
  m_process = fork();
  if (m_process == 0) {
    close(m_master);
    login_tty(m_slave);
    ResetSignals();
    if (chdir(folder.c_str()) == 0) {
      execv(raw[0], raw.data());
    }
    _exit(126);
  }
}

TerminalSession::~TerminalSession() {
  if (m_process > 0) {
    kill(m_process, SIGKILL);
    waitpid(m_process, nullptr, 0);
  }
  close(m_master);
  close(m_slave);
}

void TerminalSession::WaitUntilItBlocks(int signal) const {
  for (int waited = 0; !Blocks(m_process, signal); waited += TURN_MS) {
    if (waited >= PATIENCE_MS) {
      throw std::runtime_error("the process does not block the signal");
    }
    usleep(TURN_MS * 1000);
  }
}

bool TerminalSession::ReadSome(int timeoutMs) {
  pollfd polled{m_master, POLLIN, 0};
  if (poll(&polled, 1, timeoutMs) <= 0) {
    return false;
  }
  std::array<char, 4096> buffer;
  const ssize_t count = read(m_master, buffer.data(), buffer.size());
  m_shown.append(buffer.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
  return count > 0;
}

void TerminalSession::WaitFor(const std::string &text) {
  while (m_shown.find(text) == std::string::npos) {
    if (!ReadSome(PATIENCE_MS)) {
      throw std::runtime_error("the terminal does not show '" + text + "' but '" + m_shown + "'");
    }
  }
}

void TerminalSession::Type(const std::string &text) {
  if (write(m_master, text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
    throw std::runtime_error("write");
  }
}

bool TerminalSession::Echoes() const {
  termios settings;
  if (tcgetattr(m_slave, &settings) != 0) {
    throw std::runtime_error("tcgetattr");
  }
  return (settings.c_lflag & static_cast<tcflag_t>(ECHO)) != 0;
}

void TerminalSession::Signal(int signal) {
  kill(m_process, signal);
}

int TerminalSession::Finish() {
  int status = 0;
  // Reads do not show that the process has ended, since `m_slave` keeps the terminal open: check for that between them.
  for (int waited = 0; waitpid(m_process, &status, WNOHANG) == 0; waited += TURN_MS) {
    if (waited > PATIENCE_MS) {
      throw std::runtime_error("the process does not end; the terminal shows '" + m_shown + "'");
    }
    ReadSome(TURN_MS);
  }
  m_process = -1;
  while (ReadSome(0)) {
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

} // namespace ToolTest
