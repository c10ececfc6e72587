// SPDX-License-Identifier: Apache-2.0
/// @file
/// The program openssl_guest_host as a process.

#pragma once

#include <mutex>
#include <string>
#include <vector>

#include <sys/types.h>

namespace Testing {

/// Where the provider is that says so when it is loaded.
const char *ProviderPath() noexcept;

class HostProcess {
public:
  /// @param configuration the file that OPENSSL_CONF names; empty for none.
  HostProcess(int port, const std::vector<std::string> &deeds, const std::string &configuration = {});
  HostProcess(const HostProcess &) = delete;
  HostProcess &operator=(const HostProcess &) = delete;
  ~HostProcess();

  /// Lets it go on where it waits for its server. On any thread.
  void Continue() noexcept;

  /// Waits for its end. What it wrote, and after that how it ended, unless that was well.
  std::string Finish();

private:
  pid_t m_process = -1;
  std::mutex m_mutex; // guards the end of m_input
  int m_input = -1;
  int m_output = -1;
};

} // namespace Testing
