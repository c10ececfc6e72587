// SPDX-License-Identifier: Apache-2.0

#include "doctor_refusal.h"

#include "doctor_tls.h"

#include <tarvel/crypto/certificate_facts.h>

#include <algorithm>

namespace SsoClient::Tool {
namespace {

using Tarvel::Crypto::Certificate;
using Tarvel::Ssl::HandshakeProbe;
using Tarvel::Ssl::ServerRefusal;
using Tarvel::System::DateTime;
using Kind = ServerRefusal::Kind;

constexpr std::size_t MAX_SHOWN_NAMES = 10;
constexpr std::size_t MAX_SHOWN_REASONS = 10;

/// --thumbprint takes the digest of the server's own certificate only.
constexpr const char *AUTHORITY_ADVICE =
    "Give this authority's certificate with --ca, after you have compared it in another way.";

struct KindRow {
  Kind kind;
  const char *name;
  const char *advice;
};

constexpr KindRow KINDS[] = {
    {Kind::EXPIRED, "expired", "Have the certificate renewed. If it is still valid, correct this machine's clock."},
    {Kind::NOT_YET_VALID, "not yet valid", "Correct this machine's clock, or the certificate on the server."},
    {Kind::OTHER_NAME, "other name",
     "Use a name of the certificate in --sts, or have a certificate issued for this name."},
    {Kind::UNKNOWN_ISSUER, "unknown issuer",
     "Give the certificate of the issuer, or of an authority above it, with --ca; or have the server send the "
     "certificates between."},
    {Kind::SELF_SIGNED, "self-signed",
     "Give this certificate with --ca, or its thumbprint with --thumbprint, after you have compared it in another "
     "way."},
    {Kind::WEAK_KEY, "weak key", "Have a certificate issued for a longer key (RSA from 2048 bits, or EC from P-256)."},
    {Kind::WEAK_SIGNATURE, "weak signature", "Have a certificate issued that is signed with SHA-256 or better."},
    {Kind::WRONG_PURPOSE, "wrong purpose",
     "Have a certificate issued that allows authentication of a server, by an authority that may issue it."},
    {Kind::OTHER_THUMBPRINT, "other thumbprint",
     "If the server has a new certificate, ask its operators for the new thumbprint. Otherwise another machine answers "
     "in the place of the server."},
    {Kind::OTHER, "other", "Look into the server's certificates."},
};

const KindRow &RowOf(Kind kind) {
  return *std::find_if(std::begin(KINDS), std::end(KINDS) - 1, [kind](const KindRow &row) { return row.kind == kind; });
}

const char *AdviceFor(const ServerRefusal &refusal) {
  return refusal.kind == Kind::SELF_SIGNED && refusal.depth > 0 ? AUTHORITY_ADVICE : RowOf(refusal.kind).advice;
}

std::string DescribeNames(const DoctorTarget &target, const Certificate &certificate) {
  const std::vector<std::string> names = ShownNames(certificate);
  return names.empty() ? "The certificate is for no host name."
                       : "The certificate is for " + JoinTexts(names) + ", and not for " + Shown(target.host) + ".";
}

std::string DescribeCertificate(const DoctorTarget &target, const ServerRefusal &refusal, const DateTime &now) {
  const Certificate &certificate = *refusal.certificate;
  const std::string subject = "The certificate " + Shown(certificate.GetSubject()) + " ";
  switch (refusal.kind) {
  case Kind::EXPIRED:
  case Kind::NOT_YET_VALID:
    return subject + LeftText(certificate, now) + ".";
  case Kind::OTHER_NAME:
    return DescribeNames(target, certificate);
  case Kind::UNKNOWN_ISSUER:
    return subject + "is issued by " + Shown(certificate.GetIssuer()) + ", which is not known here.";
  case Kind::SELF_SIGNED:
    return subject + "is its own issuer, and is not trusted.";
  case Kind::WEAK_KEY:
    return subject + "has a weak key (" + Tarvel::Crypto::ReadCertificateFacts(certificate).key + ").";
  case Kind::WEAK_SIGNATURE:
    return subject + "is signed with a weak algorithm.";
  case Kind::WRONG_PURPOSE:
  case Kind::OTHER_THUMBPRINT:
  case Kind::OTHER:
    break;
  }
  return Sentence(refusal.text);
}

std::string Describe(const DoctorTarget &target, const ServerRefusal &refusal, const DateTime &now) {
  return refusal.certificate ? DescribeCertificate(target, refusal, now) : Sentence(refusal.text);
}

/// Adds the text unless `texts` contains it already.
void AddOnce(std::vector<std::string> &texts, const std::string &text) {
  if (std::find(texts.begin(), texts.end(), text) == texts.end()) {
    texts.push_back(text);
  }
}

} // namespace

const char *KindText(Kind kind) {
  return RowOf(kind).name;
}

std::vector<std::string> ShownNames(const Certificate &certificate) {
  const Tarvel::Crypto::CertificateFacts facts = Tarvel::Crypto::ReadCertificateFacts(certificate);
  std::vector<std::string> names;
  for (const std::string &name : facts.names) {
    if (names.size() == MAX_SHOWN_NAMES) {
      names.push_back("and " + std::to_string(facts.nameCount - MAX_SHOWN_NAMES) + " more");
      break;
    }
    names.push_back(Shown(name));
  }
  return names;
}

void DescribeRefusals(const DoctorTarget &target, const HandshakeProbe &handshake, const DateTime &now,
                      DoctorCheck &check) {
  std::vector<std::string> advice;
  for (const ServerRefusal &refusal : handshake.refusals) {
    if (check.found.size() > MAX_SHOWN_REASONS) {
      check.found.push_back("And " + std::to_string(handshake.refusals.size() - MAX_SHOWN_REASONS) + " more reasons.");
      break;
    }
    check.found.push_back(Describe(target, refusal, now));
    AddOnce(advice, AdviceFor(refusal));
  }
  for (const std::string &text : advice) {
    check.Fail(ExitCode::COMMUNICATION, text);
  }
}

} // namespace SsoClient::Tool
