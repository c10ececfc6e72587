// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageVerifier`, with which a SOAP service checks that the sender of a message may use the token in it.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/proof/message_part.h>
#include <ssoclient/proof/message_report.h>
#include <ssoclient/proof/proof_kind.h>
#include <ssoclient/proof/replay_guard.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/document.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// What a service requires of a message, in addition to a token that its `TokenVerifier` accepts.
struct MessageVerifierOptions {
  /// The actor (SOAP 1.1) or role (SOAP 1.2) whose header is read. If unset, the header for the last receiver.
  boost::optional<std::string> role;

  /// The header blocks that must be covered by the signature, in addition to the body and the timestamp. Each must be there
  /// exactly once.
  std::vector<MessagePart> requiredParts;

  /// Whether a bearer token without a proof is accepted. A holder-of-key token always needs a proof.
  bool acceptBearer = false;

  /// Whether the header must have a `wsu:Timestamp`. If a message is signed, its timestamp must be covered.
  bool requireTimestamp = true;

  /// How far the clocks of sender and receiver may differ, in seconds; not negative.
  std::int64_t clockToleranceSec = 60;

  /// A message that was created longer ago is refused, whatever its `Expires` says, in seconds; positive.
  std::int64_t maxAgeSec = 300;

  /// Refuses messages that were received before. Null for no guard.
  std::shared_ptr<ReplayGuard> replayGuard;
};

/// An accepted message. What is in it is verified, except what `covered` does not list.
struct VerifiedMessage {
  /// An element that the proof covers.
  struct CoveredElement {
    const Tarvel::Xml::ElementNode *element = nullptr; ///< of `document`, with everything in it
    std::string path;                                  ///< such as "/soapenv:Envelope/soapenv:Body"
  };

  std::shared_ptr<const SamlToken> token;            ///< never null
  ProofKind proof = ProofKind::BEARER;               ///< what the sender proved
  Tarvel::Ref<const Tarvel::Xml::Document> document; ///< the message that was verified; read the message from here
  const Tarvel::Xml::ElementNode *body = nullptr;    ///< the SOAP body, of `document`; never null
  std::vector<CoveredElement> covered;               ///< in document order; empty without a message signature
  boost::optional<Tarvel::System::DateTime> created; ///< of the timestamp
  boost::optional<Tarvel::System::DateTime> expires; ///< of the timestamp
  ReplayProtection replay = ReplayProtection::NOT_GUARDED; ///< whether a replay guard has accepted the message

  /// Whether `element`, which must be of `document`, is one of the covered elements or inside one of them.
  SSOCLIENT_API bool IsCovered(const Tarvel::Xml::ElementNode &element) const noexcept;
};

/// Verifies messages. Immutable: any number of threads may use one verifier at once. Copies share everything.
class SSOCLIENT_API MessageVerifier {
public:
  explicit MessageVerifier(const TokenVerifier &tokens, const MessageVerifierOptions &options = {});

  VerifiedMessage Verify(const std::string &message) const;
  /// @param peerCertificate the certificate with which the sender authenticated in TLS, or null
  VerifiedMessage Verify(const std::string &message, const Tarvel::Crypto::Certificate *peerCertificate) const;
  VerifiedMessage Verify(const Tarvel::Ref<const Tarvel::Xml::Document> &message,
                         const Tarvel::Crypto::Certificate *peerCertificate = nullptr) const;

  /// Runs the checks of `Verify`, continues after a failure, and reports each check. It does not ask the replay guard.
  MessageReport Explain(const std::string &message) const;
  MessageReport Explain(const std::string &message, const Tarvel::Crypto::Certificate *peerCertificate) const;

private:
  struct State;
  std::shared_ptr<const State> m_state;
};

} // namespace SsoClient
