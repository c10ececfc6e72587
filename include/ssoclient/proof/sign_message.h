// SPDX-License-Identifier: Apache-2.0
/// @file
/// `AttachToken` and `SignMessage`, with which a program shows its token to a SOAP service.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/proof/message_part.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/service_dialect.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/document.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// The default lifetime of a message, in seconds.
constexpr std::int64_t DEFAULT_MESSAGE_LIFETIME_SEC = 300;

/// How many header blocks `SignMessage` signs at most, in addition to body, timestamp and token.
constexpr std::size_t MAX_SIGNED_PARTS = 7;

/// How the WS-Security header is written.
struct SecurityHeaderOptions {
  /// The actor (SOAP 1.1) or role (SOAP 1.2) for which the header is. If unset, it is for the last receiver, and the
  /// attribute is not written. An empty role means the same, and so does "ultimateReceiver" in SOAP 1.2.
  boost::optional<std::string> role;

  /// Whether a new header has `mustUnderstand`, so that a receiver that does not process the header refuses the
  /// message.
  bool mustUnderstand = true;

  /// How long the message is valid, in seconds, from now; positive. Used if the header gets a new `wsu:Timestamp`.
  std::int64_t lifetimeSec = DEFAULT_MESSAGE_LIFETIME_SEC;

  /// Only `standardTokenTypeReference` is used, for the token type in the reference to the token. Receivers that
  /// enforce the Basic Security Profile refuse the message if it is false.
  ServiceDialect dialect;
};

/// Puts a bearer token into the WS-Security header (WS-Security 1.1, SAML Token Profile 1.1) of a SOAP 1.1 or 1.2
/// message.
///
/// If the message has a `wsse:Security` header for the role, the token is added to it, before what it contains.
/// Otherwise it gets a new one, and a SOAP header if it has none. A header without a `wsu:Timestamp` gets one. Nothing
/// else changes: the message's content and its existing signatures stay as they are. They do not protect what is
/// added. The token has no proof: anyone who sees the message can use it, so send it over TLS only.
///
/// @param envelope XML in UTF-8 or US-ASCII, at most `Tarvel::Xml::MAX_DOCUMENT_BYTES`
/// @return the message in UTF-8, without an XML declaration; secret, because it contains the token. Comments and
///         processing instructions outside of the envelope stay, CDATA sections become text.
/// @throws InvalidMessageException when the message is not an envelope of SOAP 1.1 or 1.2 with one body, after at most
///         one header, and nothing else; has two security headers for the role, or two timestamps in it; has an element
///         with an identifier of the token, for example because the token is attached already; has a signature that
///         covers the header that would change, the SOAP header, the envelope or the document, or for which this cannot
///         be determined (a reference that does not resolve to one element by `wsu:Id`, `Id`, `ID` or `xml:id`, a
///         transform other than canonicalisation, enveloped signature and STR-Transform); or declares a prefix that the
///         token's signature lists in an `InclusiveNamespaces` and the token does not declare.
/// @throws Tarvel::InvalidArgumentException when the token is a holder-of-key token; when its signature would not be
///         valid in any message, because it uses inclusive canonicalisation or refers to its whole document; when the
///         lifetime is not positive; or when the role contains a character that XML 1.0 does not allow.
/// @throws Tarvel::Xml::XMLParseException when the message is not well-formed or above a limit of the parser.
/// @throws Tarvel::OutOfMemoryException or std::bad_alloc when memory runs out.
///
/// Safe on any thread.
SSOCLIENT_API std::string AttachToken(const std::string &envelope, const SamlToken &token,
                                      const SecurityHeaderOptions &options = {});

/// The same for a message that is parsed already, which is changed in place. If the function throws, the message is as
/// it was. The tree must not be used by another thread at the same time.
SSOCLIENT_API void AttachToken(Tarvel::Xml::Document &envelope, const SamlToken &token,
                               const SecurityHeaderOptions &options = {});

/// Attaches a holder-of-key token to a message, like `AttachToken`, and signs the body, the timestamp, the header
/// blocks `parts` and the token, in this order, with the token's key. The signature is XML Signature with exclusive
/// canonicalisation and SHA-256 digests. Its algorithm is RSA-SHA256, or ECDSA with SHA-256, SHA-384 or SHA-512 for a
/// key on P-256, P-384 or P-521. It refers to the key by the token's identifier. What is not signed is not protected:
/// other header blocks, the other content of the security header, and the declaration of a prefix that only a value
/// uses.
///
/// An element that is signed keeps the identifier that it has (the first of `wsu:Id`, `Id`, `ID` and `xml:id`).
/// Otherwise it gets a `wsu:Id`.
///
/// @param identity the private key of the token
/// @param parts at most `MAX_SIGNED_PARTS`, each there exactly once among the header blocks of all roles
/// @throws InvalidMessageException when `AttachToken` throws it; when one of `parts` is missing or is there twice; and
///         when the body or a part needs an identifier, and adding it would change what a signature inside of it
///         signs.
/// @throws Tarvel::InvalidArgumentException when the token is a bearer token, or its key is one with which no
///         signature is accepted (`VerifyingKey::GetRefusal`); when there are too many parts, one is listed twice, has
///         no local name, or is the security header; and for the same tokens and options as `AttachToken`.
/// @throws Tarvel::Crypto::KeyMismatchException when `identity` is not the key of the token.
/// @throws Tarvel::Xml::Security::XmlSecurityException when the key fails to sign, the identifier of an element to sign
///         occurs twice or is not usable, or the message has no canonical form.
/// @throws Tarvel::TypeMismatchException for a private key, or a token with a certificate, that this library has not
///         made.
/// @throws Tarvel::Crypto::CryptoException when OpenSSL fails; Tarvel::InvalidStateException at the end of the
///         process; and everything else that `AttachToken` throws.
///
/// Safe on any thread.
SSOCLIENT_API std::string SignMessage(const std::string &envelope, const SamlToken &token,
                                      const Tarvel::Crypto::PrivateKey &identity,
                                      const std::vector<MessagePart> &parts = {},
                                      const SecurityHeaderOptions &options = {});

/// The same for a message that is parsed already, which is changed in place. If the function throws, the message is as
/// it was. The tree must not be used by another thread at the same time.
SSOCLIENT_API void SignMessage(Tarvel::Xml::Document &envelope, const SamlToken &token,
                               const Tarvel::Crypto::PrivateKey &identity, const std::vector<MessagePart> &parts = {},
                               const SecurityHeaderOptions &options = {});

} // namespace SsoClient
