// SPDX-License-Identifier: Apache-2.0
/// @file
/// A process of the program openssl_host_program.

#pragma once

#include <mutex>
#include <string>
#include <vector>

#include <sys/types.h>

namespace Testing {

/// The path of the provider that writes a line when it is loaded.
const char *ProviderPath() noexcept;

class HostProcess {
public:
  /// @param steps what the host does, in this order. @param configuration the path in OPENSSL_CONF; empty for none.
  HostProcess(int port, const std::vector<std::string> &steps, const std::string &configuration = {});
  HostProcess(const HostProcess &) = delete;
  HostProcess &operator=(const HostProcess &) = delete;
  ~HostProcess();

  /// Ends the process's wait for its server. May be called on any thread.
  void Continue() noexcept;

  /// Waits for the process to end. Returns its output, followed by how it ended unless the exit code was 0.
  std::string Finish();

private:
  pid_t m_process = -1;
  std::mutex m_mutex; // guards the end of m_input
  int m_input = -1;
  int m_output = -1;
};

} // namespace Testing
