// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the tests of the doctor's checks share: a check as text, certificates, and a point in time.

#pragma once

#include "doctor_check.h"
#include "support/data_file.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>

#include <string>
#include <vector>

namespace SsoClient::Tool {

/// A time at which most certificates of tests/data are valid, years after their start and before their end.
inline const Tarvel::System::DateTime NOON("2026-01-02T12:00:00Z");

/// The check as the tool shows it on a very wide terminal.
inline std::string TextOf(const DoctorCheck &check) {
  return RenderChecks({check}, {1000, false});
}

/// The check's object in JSON.
inline nlohmann::ordered_json JsonOf(const DoctorCheck &check) {
  return nlohmann::ordered_json::parse(RenderChecksJson({check})).at("checks").at(0);
}

/// The certificates of a file of tests/data, such as "tls/localhost".
inline Tarvel::Crypto::CertificateList CertificatesOf(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath(name + ".crt"));
}

} // namespace SsoClient::Tool
