// SPDX-License-Identifier: Apache-2.0
/// @file
/// The check of the TLS handshake, and of the server's certificates.

#pragma once

#include "doctor_check.h"
#include "doctor_network.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/server_probe.h>
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <string>

namespace SsoClient::Tool {

/// A certificate that ends within this number of days is worth a warning.
constexpr std::int64_t SOON_DAYS = 30;

/// Whole days until the certificate ends, rounded down: negative when it has ended.
std::int64_t DaysLeft(const Tarvel::Crypto::Certificate &certificate, const Tarvel::System::DateTime &now);

/// How long the certificate is valid, such as "93 days left", "expired 12 days ago" and "becomes valid in 3 days".
std::string LeftText(const Tarvel::Crypto::Certificate &certificate, const Tarvel::System::DateTime &now);

/// The facts of a certificate in JSON, for the server's chain and for the files of the command line.
nlohmann::ordered_json CertificateJson(const Tarvel::Crypto::Certificate &certificate,
                                       const Tarvel::System::DateTime &now);

/// Version, cipher, chain, and whether the server is accepted; if not, every reason.
/// @param usesThumbprint whether a thumbprint replaced the check of the chain
DoctorCheck CheckTls(const DoctorTarget &target, const Tarvel::Ssl::ServerProbe &probe, bool usesThumbprint,
                     const Tarvel::System::DateTime &now);

/// Whether a request may be sent: there is a connection, and TLS has accepted the server if the address is https.
bool MaySend(const DoctorTarget &target, const Tarvel::Ssl::ServerProbe &probe);

} // namespace SsoClient::Tool
