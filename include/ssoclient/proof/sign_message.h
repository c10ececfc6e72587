// SPDX-License-Identifier: Apache-2.0
/// @file
/// `AttachToken` and `SignMessage`, with which a program shows its token to a SOAP service.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/message_part.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/service_dialect.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/document.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// The default lifetime of a message, in seconds.
constexpr std::int64_t DEFAULT_MESSAGE_LIFETIME_SEC = 300;

/// How the WS-Security header is written.
struct SecurityHeaderOptions {
  /// The actor (SOAP 1.1) or role (SOAP 1.2) for which the header is. If unset, it is for the last receiver, and the
  /// attribute is not written.
  boost::optional<std::string> role;

  /// Whether a new header has `mustUnderstand`, so that a receiver that does not know it refuses the message.
  bool mustUnderstand = true;

  /// How long the message is valid, in seconds, from now. Used if the header gets a new `wsu:Timestamp`.
  std::int64_t lifetimeSec = DEFAULT_MESSAGE_LIFETIME_SEC;

  /// Only `standardTokenTypeReference` is used: the spelling of the token type in the reference to the token.
  ServiceDialect dialect;
};

/// Puts a bearer token into the WS-Security header of a SOAP 1.1 or 1.2 message (...).
SSOCLIENT_API std::string AttachToken(const std::string &envelope, const SamlToken &token,
                                      const SecurityHeaderOptions &options = {});

/// The same for a message that is parsed already, which is changed in place.
SSOCLIENT_API void AttachToken(Tarvel::Xml::Document &envelope, const SamlToken &token,
                               const SecurityHeaderOptions &options = {});

/// Attaches a holder-of-key token and signs the body, the timestamp and the header blocks `parts` with the token's key.
/// @param identity the private key of the token
SSOCLIENT_API std::string SignMessage(const std::string &envelope, const SamlToken &token,
                                      const Tarvel::Crypto::PrivateKey &identity,
                                      const std::vector<MessagePart> &parts = {},
                                      const SecurityHeaderOptions &options = {});

/// The same for a message that is parsed already, which is changed in place.
SSOCLIENT_API void SignMessage(Tarvel::Xml::Document &envelope, const SamlToken &token,
                               const Tarvel::Crypto::PrivateKey &identity, const std::vector<MessagePart> &parts = {},
                               const SecurityHeaderOptions &options = {});

} // namespace SsoClient
