// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where passwords and passphrases come from: a file, a descriptor, or the terminal, and never the command line.

#pragma once

#include "input_descriptor.h"
#include "option.h"

#include <cstddef>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

/// A text that is overwritten when it is no longer needed, and that nothing prints.
class Secret {
public:
  static constexpr std::size_t MAX_BYTES = 4096;

  Secret() { m_text.reserve(MAX_BYTES); } // so that no longer copy is ever needed
  Secret(Secret &&) noexcept = default;
  Secret &operator=(Secret &&) = delete;
  ~Secret();

  /// @throws Tarvel::IOException at the octet after `MAX_BYTES`.
  void Append(char octet);
  const std::string &Get() const { return m_text; }

private:
  std::string m_text;
};

/// Where one secret is to be read from. Neither a file nor a descriptor: from the terminal.
struct SecretOptions {
  const char *name = ""; ///< what the secret is called in options and messages, as "password"
  std::string file;      ///< "-" is standard input
  int descriptor = -1;

  bool IsGiven() const { return !file.empty() || descriptor >= 0; }
};

/// Adds `--NAME-file` and `--NAME-fd`, which exclude each other, and returns them.
std::vector<Option> AddSecretOptions(CLI::App &app, SecretOptions &options, const std::string &group);

/// @throws UsageException when another option reads the same descriptor.
void ClaimInput(const SecretOptions &options, InputClaims &claims);

/// The secret: the first line, without its end, of what the options name. A terminal is asked with `prompt`, and echoes
/// nothing.
/// @throws UsageException when there is no terminal to ask at.
/// @throws Tarvel::IOException when there is no line, the line is too long, or reading fails.
Secret ReadSecret(const SecretOptions &options, const std::string &prompt);

} // namespace SsoClient::Tool
