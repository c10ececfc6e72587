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
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// What a service requires of a message, in addition to a token that its `TokenVerifier` accepts.
struct MessageVerifierOptions {
  /// The actor (SOAP 1.1) or role (SOAP 1.2) whose security header is read. If unset or empty, that of the last
  /// receiver.
  boost::optional<std::string> role;

  /// The header blocks that must be covered by the signature, in addition to the body and the timestamp. Each must be
  /// there exactly once. Without a signature nothing is covered, so only their presence is checked.
  std::vector<MessagePart> requiredParts;

  /// Whether the signature must cover the token. Set it if all senders sign the token, as `SignMessage` does. Without
  /// it, an attacker with two tokens of the same key can put one of them into a message that was signed with the
  /// other.
  bool requireTokenCovered = false;

  /// Whether a bearer token without a proof is accepted. A holder-of-key token always needs a proof.
  bool acceptBearer = false;

  /// Whether the header must have a `wsu:Timestamp`. If a message is signed, its timestamp must be covered.
  bool requireTimestamp = true;

  /// How far the clocks of sender and receiver may differ, in seconds; not negative.
  std::int64_t clockToleranceSec = 60;

  /// A message that was created longer ago than this and the tolerance is refused, even if it expires later. In
  /// seconds; positive.
  std::int64_t maxAgeSec = 300;

  /// Refuses messages that were received before. Null for no guard. Needs `requireTimestamp`: a guard can forget only
  /// messages that become stale.
  std::shared_ptr<ReplayGuard> replayGuard;
};

/// An accepted message. Read the message from here, and from nowhere else: what was verified is what this tree
/// contains.
///
/// The token is verified. If the proof is MESSAGE_SIGNATURE, the covered elements are what the sender signed; nothing
/// else in the message was signed. Comments are usually not signed, so ignore them: a text with a comment in it is one
/// text. A prefix in a value, such as that of `xsi:type`, is signed, but usually not the namespace to which it is
/// bound. With another proof nothing in the message is signed, so trust the message only as far as the connection that
/// delivered it.
struct VerifiedMessage {
  /// An element that the signature covers.
  struct CoveredElement {
    const Tarvel::Xml::ElementNode *element = nullptr; ///< of `document`, with everything in it except `omitted`
    /// The signature itself, if it is in the element: it is not part of what was signed. Otherwise null.
    const Tarvel::Xml::ElementNode *omitted = nullptr;
    std::string path; ///< such as "/soapenv:Envelope/soapenv:Body", with the sender's prefixes
  };

  std::shared_ptr<const SamlToken> token;                  ///< never null
  ProofKind proof = ProofKind::BEARER;                     ///< what the sender proved
  Tarvel::Ref<const Tarvel::Xml::Document> document;       ///< the message that was verified; never null
  const Tarvel::Xml::ElementNode *body = nullptr;          ///< the SOAP body, of `document`; never null
  std::vector<CoveredElement> covered;                     ///< in document order; empty without a message signature
  boost::optional<Tarvel::System::DateTime> created;       ///< of the timestamp
  boost::optional<Tarvel::System::DateTime> expires;       ///< of the timestamp
  ReplayProtection replay = ReplayProtection::NOT_GUARDED; ///< whether a replay guard has accepted the message

  /// Whether `element`, which must be of `document`, is one of the covered elements or inside one of them, and not in
  /// the signature that the covered element omits.
  SSOCLIENT_API bool IsCovered(const Tarvel::Xml::ElementNode &element) const noexcept;
};

/// Verifies SOAP 1.1 and 1.2 messages with a SAML 2.0 token in the WS-Security header. Immutable: any number of
/// threads may use one verifier at once. Copies share everything.
///
/// The header must have exactly one token, and may have one signature that refers to it: by the SAML identifier
/// (SAML Token Profile 1.1, section 3.4), or with the token's key in its `ds:KeyInfo`. This signature is always
/// verified with the token's key, by the profile of `Tarvel::Xml::Security::Signature`. Signatures by other keys are
/// ignored and prove nothing. A header with more than 10 signatures is refused.
class SSOCLIENT_API MessageVerifier {
public:
  /// @param tokens verifies the tokens; shares its prepared keys
  /// @throws Tarvel::InvalidArgumentException when the tolerance is negative, the age is not positive, a required part
  ///         has no local name, or there is a replay guard but `requireTimestamp` is false.
  explicit MessageVerifier(const TokenVerifier &tokens, const MessageVerifierOptions &options = {});

  MessageVerifier(const MessageVerifier &) noexcept = default;            ///< shares everything
  MessageVerifier &operator=(const MessageVerifier &) noexcept = default; ///< shares everything
  ~MessageVerifier() = default;

  /// Verifies a message from a stranger: its form, the time, the token, the proof of the token's key, that the required
  /// parts are the elements that a reader of the message finds, and that they are covered. If the message is signed,
  /// the replay guard is asked last. The exception is for the first of these checks that fails.
  /// @throws Tarvel::Xml::XMLParseException when the text is not a well-formed document.
  /// @throws InvalidMessageException when it is not an envelope with one body; when it does not have exactly one
  ///         security header for the role, with one token and at most one timestamp that can be read; when a signature
  ///         in that header refers to another token, or to the token and something else; when two signatures refer to
  ///         the token, or there are more than 10; when the token has no canonical form; and when a required part is
  ///         missing, is there twice or is not covered.
  /// @throws StaleMessageException when the timestamp is in the future, has expired or is too old, also if it has
  ///         become so before the replay guard answers.
  /// @throws ParseException and InvalidSignatureException, for the token, like `TokenVerifier::Verify`.
  /// @throws InvalidProofException when the token's key did not sign the message and the sender did not authenticate
  ///         with it in TLS; when the signature is wrong or outside the profile; and for a bearer token, unless the
  ///         options accept it.
  /// @throws RepeatedMessageException when the replay guard has received the message before.
  /// @throws ReplayGuardException when the replay guard is full, cannot be reached or throws.
  /// @throws Tarvel::OutOfMemoryException, std::bad_alloc and Tarvel::InvalidStateException like
  ///         `TokenVerifier::Verify`; Tarvel::Crypto::CryptoException when OpenSSL fails. Like a ReplayGuardException
  ///         they say nothing about the message.
  VerifiedMessage Verify(const std::string &message) const;

  /// The same for a sender that may have authenticated in TLS. If a signature refers to the token, that signature must
  /// be valid, and the certificate is not considered.
  /// @param peerCertificate the certificate with which the sender authenticated, after the handshake; or null
  /// @throws Tarvel::TypeMismatchException for a certificate that this library has not made.
  VerifiedMessage Verify(const std::string &message, const Tarvel::Crypto::Certificate *peerCertificate) const;

  /// The same for a message that is parsed already. It must not be changed during the call, nor while the result is
  /// used.
  /// @throws Tarvel::InvalidArgumentException when `message` is null.
  VerifiedMessage Verify(const Tarvel::Ref<const Tarvel::Xml::Document> &message,
                         const Tarvel::Crypto::Certificate *peerCertificate = nullptr) const;

  /// Runs the checks of `Verify`, continues after a failure, and reports each check. It does not ask the replay guard.
  /// `accepted` is true exactly when `Verify` accepts the message at the same moment, apart from the guard. A call
  /// takes linear time, but several times as long as `Verify`: call it when a person wants to know why a message is
  /// refused, not for each message.
  /// @throws Tarvel::OutOfMemoryException, std::bad_alloc, Tarvel::InvalidStateException and
  ///         Tarvel::Crypto::CryptoException like `Verify`, and nothing else: no message makes it throw.
  MessageReport Explain(const std::string &message) const;

  /// The same for a sender that may have authenticated in TLS.
  /// @throws Tarvel::TypeMismatchException for a certificate that this library has not made.
  MessageReport Explain(const std::string &message, const Tarvel::Crypto::Certificate *peerCertificate) const;

private:
  struct State;
  std::shared_ptr<const State> m_state;
};

} // namespace SsoClient
