// SPDX-License-Identifier: Apache-2.0
/// @file
/// The development token service as a separate process, as long as a test needs it.

#pragma once

#include <string>
#include <string_view>
#include <vector>

#include <sys/types.h>

namespace Testing {

/// How a process has ended.
struct ProcessEnd {
  int exitCode = -1; ///< 128 plus the number of the signal, when one ended the process
  std::string out;   ///< the output after the ready line
};

/// A running service. A test program that uses one must declare it in CMake: ssoclient_needs_devsts(TARGET).
class DevSts {
public:
  /// Starts the service on a free port and waits until it is ready. The first start in a build makes the keys, and all
  /// later starts use them, unless `arguments` has another --state. The service gets `arguments` after --until-eof.
  /// @throws std::runtime_error with the service's exit code and output when it is not ready within two minutes
  explicit DevSts(const std::vector<std::string> &arguments = {});
  DevSts(const DevSts &) = delete;
  DevSts &operator=(const DevSts &) = delete;
  /// Ends the service, by force if necessary. If the test program dies earlier, the service ends because its standard
  /// input ends. A service that ends with a failure, for example after a sanitizer's report, ends the test program with
  /// a failure.
  ~DevSts();

  /// The path of the service's program.
  static const char *GetProgram() noexcept;

  const std::string &GetUrl() const noexcept { return m_url; }
  /// The address at which the service gives this wrong answer.
  std::string FaultUrl(std::string_view fault) const { return m_url + "/fault/" + std::string(fault); }
  int GetPort() const noexcept { return m_port; }
  pid_t GetProcess() const noexcept { return m_process; }
  const std::string &GetThumbprint() const noexcept { return m_thumbprint; }
  const std::string &GetReadyLine() const noexcept { return m_readyLine; }

  /// The path of a file of the state folder, such as "authority.crt", "signing.crt", "client.key", "other-client.crt".
  std::string PathOf(std::string_view file) const { return m_folder + "/" + std::string(file); }
  /// The content of such a file.
  std::string ReadStateFile(std::string_view file) const;

  /// The service's output on standard error so far.
  std::string GetLog() const;

  /// Sends the signal, or with 0 closes the service's standard input, and waits for the end of the process.
  ProcessEnd End(int signal = 0);

private:
  /// The path of the state folder of services that are started without --state.
  static const char *GetUsualState() noexcept;

  void Start(const std::vector<std::string> &arguments);
  void ReadReadyLine();
  bool AwaitEnd(int milliseconds, int &status) noexcept;
  int Stop() noexcept;
  void Close() noexcept;

  std::string m_url;
  std::string m_folder;
  std::string m_thumbprint;
  std::string m_readyLine;
  std::string m_rest;
  int m_port = 0;
  pid_t m_process = -1; // -1 once it has ended
  int m_in = -1;
  int m_out = -1;
  int m_log = -1;
};

} // namespace Testing
