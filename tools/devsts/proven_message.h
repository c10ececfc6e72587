// SPDX-License-Identifier: Apache-2.0
/// @file
/// The checks of a message whose sender must prove that it may use the token.

#pragma once

#include "certificate.h"
#include "signature_engine.h"
#include "soap_version.h"
#include "time_text.h"
#include "token_facts.h"
#include "xml_tree.h"

#include <chrono>
#include <string>
#include <string_view>

namespace DevSts {

/// The address of this service in a token's audience. Its namespace is the same.
constexpr const char *ECHO_AUDIENCE = Ns::ECHO.uri;

enum class Proof {
  BEARER,            ///< only that the sender has the token
  MESSAGE_SIGNATURE, ///< that it has the token's key: it signed the message with it
  TLS_CERTIFICATE    ///< that it has the token's key: it authenticated the connection with it
};

/// "bearer", "message-signature" or "tls-certificate".
const char *ProofName(Proof proof);

struct ProofPolicy {
  std::chrono::seconds tolerance{60};
  const SignatureKey *tokenSigner = nullptr;
  bool acceptsBearer = false;
};

/// A message that has been checked. Nodes belong to `document`.
struct ProvenMessage {
  Document document;
  xmlNode *header = nullptr;
  xmlNode *body = nullptr;
  TokenFacts token;
  std::string tokenId;
  Proof proof = Proof::BEARER;
  Time expires; ///< of the timestamp
  /// SHA-256 over the canonical form of what was signed and the key; empty without a signature of the message.
  std::string identifier;
};

/// @param peerCertificate the TLS certificate of the client; null when it has none
/// @throws Refusal
ProvenMessage CheckProvenMessage(std::string_view xml, const SoapVersion &version, const X509 *peerCertificate,
                                 const ProofPolicy &policy);

} // namespace DevSts
