// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SoftwareTpm`, a TPM 2.0 for one test, emulated by swtpm.

#pragma once

#include "support/work_folder.h"

#include <string>

#include <sys/types.h>

namespace Testing {

/// Needs no root privileges, and leaves the machine's TPM alone. The TPM ends with this object, and also when this process is
/// killed. It has one connection at a time: a program that uses it keeps other programs waiting until it ends.
class SoftwareTpm {
public:
  /// Which of the programs and libraries that are needed are missing, and their packages; empty if there are all of them.
  static std::string FindMissing();

  /// @throws std::runtime_error with the output of the program that failed
  SoftwareTpm();
  SoftwareTpm(const SoftwareTpm &) = delete;
  SoftwareTpm &operator=(const SoftwareTpm &) = delete;
  ~SoftwareTpm();

  /// Makes a key in the TPM that can only sign and never leave it, and gives it a persistent handle.
  /// @param algorithm as in `tpm2_create`, such as "rsa2048" or "ecc256"
  /// @return the key's URI, such as "handle:0x81000001"
  std::string MakeKey(const std::string &algorithm);

  /// Makes a key outside of the TPM's permanent memory: a file that only this TPM can use.
  /// @return the path of the file
  std::string MakeKeyFile();

  /// Issues a certificate for a client: for the key with this URI, by the authority with these files.
  /// @return the path of the PEM file
  std::string IssueCertificate(const std::string &keyUri, const std::string &authority,
                               const std::string &authorityKey);

  /// The same for a request for a certificate, a file of the folder.
  std::string SignRequest(const std::string &request, const std::string &authority,
                          const std::string &authorityKey) const;

  /// The path of the tool.
  static const char *GetTool() noexcept;

  /// Sets the environment of this process so that OpenSSL's configuration has the TPM's provider. Programs that this
  /// process starts use it, too.
  void SetEnvironment() const;

  /// The same environment as assignments in front of a shell's command.
  std::string GetEnvironment() const;

  /// Runs a shell's command in the folder of the TPM's files, with its environment.
  /// @return the output
  /// @throws std::runtime_error with the output when the command fails
  std::string Run(const std::string &command) const;

  /// Where the tests put their files.
  const WorkFolder &GetFolder() const noexcept { return m_folder; }

private:
  void Start();
  void AwaitReady() const;

  const WorkFolder m_folder;
  pid_t m_process = -1;
  int m_keys = 0;
};

} // namespace Testing
