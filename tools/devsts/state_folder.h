// SPDX-License-Identifier: Apache-2.0
/// @file
/// The folder that keeps the service's keys and certificates from one start to the next.

#pragma once

#include "certificate.h"

#include <filesystem>
#include <string>

namespace DevSts {

/// A key and its certificate, in files of the state folder.
struct Identity {
  std::filesystem::path keyFile;
  std::filesystem::path certificateFile;
  Certificate certificate;
};

struct StateFolder {
  std::filesystem::path path;
  Identity authority;   ///< issued all others but `foreign`
  Identity tls;         ///< the HTTPS server's
  Identity signing;     ///< signs tokens
  Identity foreign;     ///< signs the tokens that nobody is to trust
  Identity client;      ///< for use by clients: principal client@corp.example
  Identity otherClient; ///< likewise: other-client@corp.example
};

/// Opens the folder, makes it (for its owner alone) and what is missing in it. Two services may open the same folder at
/// once. @throws std::runtime_error naming the file when something is there and cannot be used
StateFolder OpenStateFolder(const std::filesystem::path &path);

} // namespace DevSts
