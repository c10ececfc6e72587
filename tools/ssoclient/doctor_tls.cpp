// SPDX-License-Identifier: Apache-2.0

#include "doctor_tls.h"

#include "doctor_refusal.h"

#include <tarvel/crypto/certificate_facts.h>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;
using Tarvel::Crypto::Certificate;
using Tarvel::Ssl::HandshakeProbe;
using Tarvel::Ssl::ServerProbe;
using Tarvel::System::DateTime;
using Outcome = HandshakeProbe::Outcome;

constexpr std::int64_t MICROSECONDS_PER_DAY = 24 * 60 * 60 * Tarvel::System::MICROSECONDS_PER_SECOND;

std::string DaysText(std::int64_t microseconds) {
  const std::int64_t days = microseconds / MICROSECONDS_PER_DAY;
  return days == 0 ? "less than a day" : Count(days, "day");
}

/// A handshake that failed for another reason than a refused certificate.
struct Breakdown {
  Outcome outcome;
  const char *text;
  const char *advice;
};

constexpr Breakdown BREAKDOWNS[] = {
    {Outcome::PLAIN_HTTP, "The server answers with HTTP, without TLS.",
     "Correct the port in --sts, or have TLS enabled at that port."},
    {Outcome::NOT_TLS, "The server answers, but not with TLS.", "Correct the port in --sts."},
    {Outcome::NO_COMMON_VERSION, "The server offers neither TLS 1.2 nor TLS 1.3.",
     "Have TLS 1.2 or 1.3 enabled on the server."},
    {Outcome::TOO_LONG, "A message of the handshake is too long, usually the server's chain of certificates.",
     "Have the server send its own certificate and those up to its authority, and no others."},
    {Outcome::TIMED_OUT, "The server accepts the connection, but does not end the handshake in time.",
     "Look into the server's log, correct the port in --sts, or raise --timeout."},
};

void DescribeBreakdown(const HandshakeProbe &handshake, DoctorCheck &check) {
  for (const Breakdown &known : BREAKDOWNS) {
    if (known.outcome == handshake.outcome) {
      check.found.emplace_back(known.text);
      check.Fail(ExitCode::COMMUNICATION, known.advice);
      return;
    }
  }
  check.found.push_back(Sentence(handshake.failure));
  check.Fail(ExitCode::COMMUNICATION, "Look into the server's log.");
}

std::string ProtocolText(const HandshakeProbe &handshake) {
  return handshake.version + " with " + handshake.cipher;
}

/// The certificate that the server showed as its own, if it can be read.
const Certificate *OwnCertificate(const HandshakeProbe &handshake) {
  return handshake.chain.empty() ? nullptr : handshake.chain.front().get();
}

void DescribeThumbprint(const HandshakeProbe &handshake, DoctorCheck &check) {
  const Certificate *const own = OwnCertificate(handshake);
  if (!own) {
    return;
  }
  check.found.push_back("SHA-256 thumbprint of its certificate: " + own->GetSha256Thumbprint());
  if (handshake.outcome != Outcome::ACCEPTED) {
    check.found.emplace_back(
        "The server is not verified: compare the thumbprint in another way, such as by telephone with "
        "its operators, before you trust it.");
  }
}

void AddChain(const HandshakeProbe &handshake, const DateTime &now, DoctorCheck &check) {
  std::size_t number = 0;
  for (const auto &certificate : handshake.chain) {
    const std::string begin = "Certificate " + std::to_string(++number) + ": ";
    if (!certificate) {
      check.details.push_back(begin + "cannot be read.");
      check.facts["chain"].push_back(nullptr);
      continue;
    }
    check.details.push_back(begin + Shown(certificate->GetSubject()) + ", issued by " +
                            Shown(certificate->GetIssuer()) + "; " + LeftText(*certificate, now) + ".");
    check.facts["chain"].push_back(CertificateJson(*certificate, now));
  }
  if (handshake.chainLength > handshake.chain.size()) {
    check.details.push_back("And " + std::to_string(handshake.chainLength - handshake.chain.size()) + " more.");
  }
}

Json TextOrNull(const std::string &text) {
  return text.empty() ? Json(nullptr) : Json(Shown(text));
}

Json FactsOf(const HandshakeProbe &handshake) {
  Json facts = {{"version", TextOrNull(handshake.version)},
                {"cipher", TextOrNull(handshake.cipher)},
                {"accepted", handshake.outcome == Outcome::ACCEPTED},
                {"failure", TextOrNull(handshake.failure)},
                {"reasons", Json::array()},
                {"names", Json::array()},
                {"thumbprint", nullptr},
                {"chain", Json::array()},
                {"chainLength", handshake.chainLength},
                {"durationMs", Milliseconds(handshake.durationMicroseconds)}};
  if (const Certificate *const own = OwnCertificate(handshake)) {
    facts["thumbprint"] = own->GetSha256Thumbprint();
    facts["names"] = ShownNames(*own);
  }
  for (const Tarvel::Ssl::ServerRefusal &refusal : handshake.refusals) {
    facts["reasons"].push_back(
        {{"kind", KindText(refusal.kind)},
         {"subject", refusal.certificate ? Json(Shown(refusal.certificate->GetSubject())) : Json(nullptr)},
         {"text", Shown(refusal.text)}});
  }
  return facts;
}

void WarnOfEnds(const HandshakeProbe &handshake, const DateTime &now, DoctorCheck &check) {
  for (const auto &certificate : handshake.chain) {
    if (certificate && DaysLeft(*certificate, now) < SOON_DAYS) {
      check.Warn("Have the certificate " + Shown(certificate->GetSubject()) + " renewed (" +
                 LeftText(*certificate, now) + ").");
    }
  }
}

} // namespace

std::int64_t DaysLeft(const Certificate &certificate, const DateTime &now) {
  const std::int64_t left = certificate.GetNotAfter().MicrosecondsSince(now);
  return left / MICROSECONDS_PER_DAY - (left % MICROSECONDS_PER_DAY < 0 ? 1 : 0);
}

std::string LeftText(const Certificate &certificate, const DateTime &now) {
  const std::int64_t until = certificate.GetNotBefore().MicrosecondsSince(now);
  if (until > 0) {
    return "becomes valid in " + DaysText(until);
  }
  const std::int64_t left = certificate.GetNotAfter().MicrosecondsSince(now);
  return left < 0 ? "expired " + DaysText(-left) + " ago" : DaysText(left) + " left";
}

Json CertificateJson(const Certificate &certificate, const DateTime &now) {
  return {{"subject", Shown(certificate.GetSubject())},
          {"issuer", Shown(certificate.GetIssuer())},
          {"notBefore", certificate.GetNotBefore().ToString()},
          {"notAfter", certificate.GetNotAfter().ToString()},
          {"daysLeft", DaysLeft(certificate, now)},
          {"key", Tarvel::Crypto::ReadCertificateFacts(certificate).key},
          {"sha256", certificate.GetSha256Thumbprint()}};
}

bool MaySend(const DoctorTarget &target, const ServerProbe &probe) {
  return target.isSecure ? probe.handshake && probe.handshake->outcome == Outcome::ACCEPTED : IsConnected(probe);
}

DoctorCheck CheckTls(const DoctorTarget &target, const ServerProbe &probe, bool usesThumbprint, const DateTime &now) {
  DoctorCheck check("tls");
  if (!target.isSecure) {
    check.found.emplace_back("The address is plain http: nothing is encrypted, and the server is not verified.");
    check.Warn("Use an https address: otherwise passwords and tokens are sent unencrypted.");
    return check;
  }
  if (!probe.handshake) {
    check.Skip("There is no connection.");
    return check;
  }
  const HandshakeProbe &handshake = *probe.handshake;
  check.facts = FactsOf(handshake);
  const std::string duration = DurationText(handshake.durationMicroseconds);
  if (handshake.outcome == Outcome::ACCEPTED) {
    check.found.push_back(ProtocolText(handshake) + "; the server is accepted" +
                          (usesThumbprint ? " by its thumbprint " : " ") + duration + ".");
    WarnOfEnds(handshake, now, check);
  } else if (handshake.outcome == Outcome::CERTIFICATE_REFUSED) {
    check.found.push_back(ProtocolText(handshake) + "; the server is refused " + duration + ".");
    DescribeRefusals(target, handshake, now, check);
  } else {
    DescribeBreakdown(handshake, check);
  }
  DescribeThumbprint(handshake, check);
  AddChain(handshake, now, check);
  return check;
}

} // namespace SsoClient::Tool
