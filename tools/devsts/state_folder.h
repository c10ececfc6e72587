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
  Identity authority;   ///< issued all others except `foreign`
  Identity tls;         ///< the HTTPS server's
  Identity signing;     ///< signs tokens
  Identity foreign;     ///< signs the tokens that no client should trust
  Identity client;      ///< for use by clients: principal client@corp.example
  Identity otherClient; ///< another one: principal other-client@corp.example
};

/// Opens the folder. Creates it, readable only for its owner, and the files that are missing in it. Two services may
/// open the same folder at once. @throws std::runtime_error naming the file that exists and cannot be used
StateFolder OpenStateFolder(const std::filesystem::path &path);

} // namespace DevSts
