// SPDX-License-Identifier: Apache-2.0

#include "echo_service.h"

#include "responses.h"

#include <utility>

namespace DevSts {

namespace {

constexpr std::size_t MOST_REMEMBERED = 100'000;

/// The HTTP status of a fault: 500, except that SOAP 1.2 has 400 for a fault of the sender (SOAP 1.2 part 2, 7.5.2).
int StatusOf(const FaultCode &code, const SoapVersion &version) {
  return version == SOAP_1_2 && IsFaultOfSender(code) ? 400 : 500;
}

} // namespace

EchoService::EchoService(const StateFolder &state, std::chrono::seconds tolerance, bool acceptsBearer)
    : m_tokenSigner(PublicKeyOf(*state.signing.certificate)), m_policy{tolerance, &m_tokenSigner, acceptsBearer},
      m_replays(MOST_REMEMBERED) {}

SoapAnswer EchoService::Answer(std::string_view message, const SoapVersion &version,
                               const X509 *peerCertificate) const {
  SoapAnswer answer;
  try {
    ProvenMessage accepted = Accept(message, version, peerCertificate);
    answer.log = "echoed for " + accepted.token.subject + " (" + ProofName(accepted.proof) + ")";
    answer.body = Serialise(*EchoResponse(std::move(accepted)));
  } catch (const Refusal &refusal) {
    const FaultCode &code = refusal.GetCode();
    answer.status = StatusOf(code, version);
    answer.body = Serialise(*VersionedFaultResponse(version, code, refusal.what()));
    answer.log = std::string("refused, ") + code.ns.prefix + ":" + code.name + ": " + refusal.what();
  }
  return answer;
}

ProvenMessage EchoService::Accept(std::string_view message, const SoapVersion &version,
                                  const X509 *peerCertificate) const {
  ProvenMessage checked = CheckProvenMessage(message, version, peerCertificate, m_policy);
  if (checked.identifier.empty()) {
    return checked;
  }
  switch (m_replays.Remember(checked.identifier, checked.expires + m_policy.tolerance, Now())) {
  case Replays::Answer::REPEATED:
    throw Refusal(Code::INVALID_SECURITY, "the message was received before");
  case Replays::Answer::FULL:
    throw Refusal(Code::SERVER, "the service has too many messages to remember; try again later");
  case Replays::Answer::FIRST:
    break;
  }
  return checked;
}

} // namespace DevSts
