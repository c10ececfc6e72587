// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ServerProcess`, a scripted server in a separate process, so that no child of the test inherits its connections or
/// its threads' use of OpenSSL.

#pragma once

#include "support/scripted_server.h"

#include <optional>
#include <sys/types.h>

namespace Testing {

class ServerProcess {
public:
  explicit ServerProcess(const ScriptedServer::Script &script, const std::optional<TlsSettings> &tls = std::nullopt);
  ServerProcess(const ServerProcess &) = delete;
  ServerProcess &operator=(const ServerProcess &) = delete;
  ~ServerProcess();

  int GetPort() const noexcept { return m_port; }

private:
  pid_t m_process = -1;
  int m_port = 0;
};

} // namespace Testing
