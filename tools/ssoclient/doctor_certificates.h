// SPDX-License-Identifier: Apache-2.0
/// @file
/// The check of the certificates of --trust and --ca.

#pragma once

#include "doctor_check.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/server_probe.h>
#include <tarvel/system/date_time.h>

#include <string>
#include <vector>

namespace SsoClient::Tool {

/// The certificates of one file.
struct CertificateFile {
  std::string path;
  bool isAuthority = false; ///< --ca; otherwise --trust
  Tarvel::Crypto::CertificateList certificates;
};

/// Which certificates have ended or end soon, which keys are not accepted, and whether the server's chain ends in --ca.
DoctorCheck CheckCertificates(const std::vector<CertificateFile> &files, const Tarvel::Ssl::ServerProbe &probe,
                              const Tarvel::System::DateTime &now);

} // namespace SsoClient::Tool
