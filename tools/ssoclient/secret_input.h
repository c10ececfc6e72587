// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading passwords and passphrases from a file, a descriptor or the terminal, and never from the command line.

#pragma once

#include "input_descriptor.h"
#include "option.h"

#include <tarvel/core/secret_text.h>

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

/// Where to read a secret from: the terminal, when there is neither a file nor a descriptor.
struct SecretOptions {
  const char *name = ""; ///< what options and messages call the secret, such as "password"
  std::string file;      ///< "-" is standard input
  int descriptor = -1;

  bool IsGiven() const { return !file.empty() || descriptor >= 0; }
};

/// Adds `--NAME-file` and `--NAME-fd`, which exclude each other, and returns them.
std::vector<Option> AddSecretOptions(CLI::App &app, SecretOptions &options, const std::string &group);

/// @throws UsageException when another option reads the same descriptor.
void ClaimInput(const SecretOptions &options, InputClaims &claims);

/// The first line of the source that the options choose, without its line end. A terminal shows `prompt` and does not
/// echo what is typed.
/// @throws UsageException when a terminal is needed and there is none.
/// @throws Tarvel::IOException when there is no line, the line is longer than 4096 octets, or reading fails.
Tarvel::SecretText ReadSecret(const SecretOptions &options, const std::string &prompt);

} // namespace SsoClient::Tool
