// SPDX-License-Identifier: Apache-2.0

#include "integration/fork/server_process.h"

#include <cerrno>
#include <csignal>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>

namespace Testing {

namespace {

void RunServer(const ScriptedServer::Script &script, const std::optional<TlsSettings> &tls, int portPipe) noexcept {
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  const ScriptedServer server(script, tls);
  const int port = server.GetPort();
  if (::write(portPipe, &port, sizeof port) == static_cast<ssize_t>(sizeof port)) {
    ::pause(); // until it is killed
  }
  ::_exit(1);
}

} // namespace

ServerProcess::ServerProcess(const ScriptedServer::Script &script, const std::optional<TlsSettings> &tls) {
  int ends[2] = {-1, -1};
  if (::pipe(ends) != 0) {
    throw std::system_error(errno, std::system_category(), "pipe");
  }
  m_process = ::fork();
  if (m_process == 0) {
    ::close(ends[0]);
    RunServer(script, tls, ends[1]);
  }
  ::close(ends[1]);
  const bool isUp = m_process > 0 && ::read(ends[0], &m_port, sizeof m_port) == static_cast<ssize_t>(sizeof m_port);
  ::close(ends[0]);
  if (!isUp) {
    throw std::system_error(ECHILD, std::generic_category(), "the server did not start");
  }
}

ServerProcess::~ServerProcess() {
  ::kill(m_process, SIGKILL);
  ::waitpid(m_process, nullptr, 0);
}

} // namespace Testing
