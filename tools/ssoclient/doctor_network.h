// SPDX-License-Identifier: Apache-2.0
/// @file
/// The checks of the service's address and of its port.

#pragma once

#include "doctor_check.h"

#include <tarvel/ssl/server_probe.h>

#include <cstdint>
#include <string>

namespace SsoClient::Tool {

/// Where the service is, from its URL.
struct DoctorTarget {
  bool isSecure = false;
  std::string host;
  int port = 0;
  std::string path;
};

/// The name, its addresses, and how long the look-up took.
DoctorCheck CheckAddress(const DoctorTarget &target, const Tarvel::Ssl::ServerProbe &probe);

/// Which of the addresses answer, and which do not.
DoctorCheck CheckTcp(const DoctorTarget &target, const Tarvel::Ssl::ServerProbe &probe);

/// Whether any address answered.
bool IsConnected(const Tarvel::Ssl::ServerProbe &probe);

} // namespace SsoClient::Tool
