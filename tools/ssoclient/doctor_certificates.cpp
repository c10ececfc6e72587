// SPDX-License-Identifier: Apache-2.0

#include "doctor_certificates.h"

#include "doctor_tls.h"

#include <tarvel/crypto/certificate_facts.h>

#include <algorithm>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;
using Tarvel::Crypto::Certificate;
using Tarvel::System::DateTime;

/// What the check counts.
struct Tally {
  std::size_t certificates = 0;
  std::size_t trusted = 0;  ///< of --trust
  std::size_t unusable = 0; ///< of those, with a key that is not accepted
};

std::string NameOf(const Certificate &certificate, const CertificateFile &file) {
  return Shown(certificate.GetSubject()) + " of " + Shown(file.path);
}

void CheckDates(const Certificate &certificate, const CertificateFile &file, const DateTime &now, DoctorCheck &check) {
  const bool isEarly = now < certificate.GetNotBefore();
  const std::int64_t days = DaysLeft(certificate, now);
  if (!isEarly && days >= SOON_DAYS) {
    return;
  }
  check.found.push_back(NameOf(certificate, file) + " " + (isEarly || days < 0 ? "" : "has ") +
                        LeftText(certificate, now) + ".");
  const std::string get =
      isEarly ? "Correct this machine's clock if it is wrong. If it is right, get the " : "Get the ";
  const std::string next = isEarly ? "present certificate" : "next certificate";
  if (file.isAuthority) {
    check.Warn(get + "authority's " + next +
               ", and give it with --ca: a server is accepted only while this one is valid.");
  } else {
    check.Warn(get + "service's " + next + ", and give it with --trust. The key of this one stays trusted.");
  }
}

void CheckKey(const Certificate &certificate, const CertificateFile &file, DoctorCheck &check, Tally &tally) {
  if (file.isAuthority) {
    return; // TLS has its own rules for keys
  }
  ++tally.trusted;
  const std::string refusal = Tarvel::Crypto::ReadCertificateFacts(certificate).keyRefusal;
  if (!refusal.empty()) {
    ++tally.unusable;
    check.found.push_back("No token signed with the key of " + NameOf(certificate, file) + " is accepted: " + refusal +
                          ".");
    check.Warn("Have tokens signed with an RSA key of at least 2048 bits, or an EC key on P-256, P-384 or P-521.");
  }
}

void AddCertificate(const Certificate &certificate, const CertificateFile &file, const DateTime &now,
                    DoctorCheck &check, Tally &tally) {
  ++tally.certificates;
  Json entry = {{"file", Shown(file.path)}, {"use", file.isAuthority ? "ca" : "trust"}};
  entry.update(CertificateJson(certificate, now));
  check.details.push_back(NameOf(certificate, file) + ": " + entry["key"].get<std::string>() + "; " +
                          LeftText(certificate, now) + ".");
  check.facts["certificates"].push_back(std::move(entry));
  CheckDates(certificate, file, now, check);
  CheckKey(certificate, file, check, tally);
}

bool Contains(const CertificateFile &file, const Certificate &wanted) {
  return std::any_of(file.certificates.begin(), file.certificates.end(),
                     [&wanted](const auto &certificate) { return certificate->GetDer() == wanted.GetDer(); });
}

/// Reports whether the server's chain ends in one of the authorities. If it does not, TLS has refused the server.
void CheckAnchor(const std::vector<CertificateFile> &files, const Tarvel::Ssl::ServerProbe &probe, DoctorCheck &check) {
  const auto authorities =
      std::find_if(files.begin(), files.end(), [](const CertificateFile &file) { return file.isAuthority; });
  if (authorities == files.end() || !probe.handshake || probe.handshake->chain.empty()) {
    return;
  }
  const auto &anchor = probe.handshake->anchor;
  const bool isKnown = anchor && Contains(*authorities, *anchor);
  check.facts["chainEndsInCa"] = isKnown;
  check.found.push_back(isKnown ? "The server's chain ends in " + NameOf(*anchor, *authorities) + "."
                                : "The server's chain ends in no certificate of " + Shown(authorities->path) + ".");
}

} // namespace

DoctorCheck CheckCertificates(const std::vector<CertificateFile> &files, const Tarvel::Ssl::ServerProbe &probe,
                              const DateTime &now) {
  DoctorCheck check("certificates");
  check.facts = {{"certificates", Json::array()}, {"chainEndsInCa", nullptr}};
  if (files.empty()) {
    check.Skip("Neither --trust nor --ca is given.");
    return check;
  }
  Tally tally;
  check.found.emplace_back(); // the count, which is not known yet
  for (const CertificateFile &file : files) {
    for (const auto &certificate : file.certificates) {
      AddCertificate(*certificate, file, now, check, tally);
    }
  }
  check.found.front() = Count(static_cast<std::int64_t>(tally.certificates), "certificate") + ".";
  if (tally.unusable > 0 && tally.unusable == tally.trusted) {
    check.Fail(ExitCode::FILE_OR_KEY,
               "Give a certificate with --trust whose key is accepted: with these, every token is refused.");
  }
  CheckAnchor(files, probe, check);
  return check;
}

} // namespace SsoClient::Tool
