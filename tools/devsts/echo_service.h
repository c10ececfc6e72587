// SPDX-License-Identifier: Apache-2.0
/// @file
/// A service that is protected by tokens: it answers a message with the same body, if the message is proven.

#pragma once

#include "proven_message.h"
#include "replays.h"
#include "state_folder.h"
#include "token_service.h"

#include <chrono>
#include <string_view>

namespace DevSts {

/// Any number of threads may use it at once.
class EchoService {
public:
  /// `state` outlives the service. @throws std::runtime_error when a key cannot be used
  EchoService(const StateFolder &state, std::chrono::seconds tolerance, bool acceptsBearer);

  /// A refusal is also an answer.
  /// @param peerCertificate the TLS certificate of the client; null when it has none
  SoapAnswer Answer(std::string_view message, const SoapVersion &version, const X509 *peerCertificate) const;

private:
  ProvenMessage Accept(std::string_view message, const SoapVersion &version, const X509 *peerCertificate) const;

  const SignatureKey m_tokenSigner;
  const ProofPolicy m_policy;
  mutable Replays m_replays;
};

} // namespace DevSts
