// SPDX-License-Identifier: Apache-2.0
/// @file
/// The command line.

#pragma once

#include "faults.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <variant>

namespace DevSts {

struct Options {
  std::filesystem::path state;
  std::uint16_t port = 0;
  std::optional<std::filesystem::path> users;
  std::optional<std::filesystem::path> keytab;
  Fault fault;
  std::string charset = "UTF-8";
  std::chrono::seconds tolerance{60};
  bool untilEof = false;
  bool acceptsBearer = false;       ///< of the echo service
  bool asksForCertificates = false; ///< of clients, in the TLS handshake
};

/// Returns the options. When the command line is wrong or asks for help, writes the error or the help, and returns the
/// exit code.
std::variant<Options, int> ReadOptions(int argc, char **argv);

} // namespace DevSts
