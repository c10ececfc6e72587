// SPDX-License-Identifier: Apache-2.0
/// @file
/// Why TLS refuses a server, in words for people, and what to do about each reason.

#pragma once

#include "doctor_check.h"
#include "doctor_network.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/server_probe.h>
#include <tarvel/system/date_time.h>

#include <string>
#include <vector>

namespace SsoClient::Tool {

/// The kind's name in JSON, such as "expired".
const char *KindText(Tarvel::Ssl::ServerRefusal::Kind kind);

/// The names that the certificate is for, at most ten of them.
std::vector<std::string> ShownNames(const Tarvel::Crypto::Certificate &certificate);

/// Adds each reason, and makes the check one that failed. There must be a reason.
void DescribeRefusals(const DoctorTarget &target, const Tarvel::Ssl::HandshakeProbe &handshake,
                      const Tarvel::System::DateTime &now, DoctorCheck &check);

} // namespace SsoClient::Tool
