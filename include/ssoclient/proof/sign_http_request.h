// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SignHttpRequest`, with which a program shows its token to an HTTP service, by HTTP message signatures (RFC 9421).

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/http_request.h>
#include <ssoclient/saml_token.h>
#include <tarvel/crypto/private_key.h>

#include <boost/optional.hpp>

#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// How a request is signed.
struct HttpSigningOptions {
  TokenHeader tokenHeader; ///< how the token is written

  /// Names of further header fields that are signed. Each must be in the request exactly once. A proxy on the way must not
  /// change these fields.
  std::vector<std::string> coveredHeaders;

  /// The label by which the two fields refer to this signature: lower-case letters, digits and "_-.*", the first a
  /// letter or "*" (RFC 8941, section 3.2).
  std::string label = "sso";

  /// The `nonce` parameter, printable ASCII. Two equal requests within one second differ only in it. Unset for a new random
  /// one, which is right for nearly every program.
  boost::optional<std::string> nonce;
};

/// The header fields with which a request shows a holder-of-key token and proves that the sender has its key. Add them to the
/// request, which must not have them yet, and send it unchanged.
///
/// The fields are, in this order: the token's field; `Content-Digest` (RFC 9530, by SHA-256), if the request has a body;
/// `Signature-Input` and `Signature`. The signature covers "@method", "@target-uri", the token's field, `content-digest`, and
/// `coveredHeaders`. Its parameters are `created` (now), `nonce`, `keyid` (the SHA-256 thumbprint of the key's
/// SubjectPublicKeyInfo, as 64 hexadecimal digits) and `alg`. The key decides the algorithm: rsa-v1_5-sha256 for an RSA key,
/// ecdsa-p256-sha256 and ecdsa-p384-sha384 for an EC key on P-256 and P-384.
///
/// Nothing in the result is secret, but the request can be sent again by anyone who reads it, until it is too old or if the
/// service has no replay guard: send it through TLS. Safe on any thread.
/// @param token a holder-of-key token, which may have a certificate or a key value
/// @param identity the private key of the token; it may be a key that cannot be exported
/// @throws Tarvel::Crypto::KeyMismatchException when `identity` is another key.
/// @throws Tarvel::InvalidArgumentException when `token` is a bearer token or has no key that can be used; for a key on P-521
///         and an RSA key of less than 2048 bits; when the method or the target is not valid; when a header field has a
///         malformed name or a control character, or all fields are longer than `MAX_HTTP_HEADER_OCTETS`; when a field that is
///         covered is missing, is there more than once, or is not ASCII; when the request has one of the new fields already;
///         and when an option does not have its form. Nothing is signed before these checks.
/// @throws Tarvel::Crypto::CryptoException when OpenSSL or the provider of the key fails; Tarvel::InvalidStateException,
///         Tarvel::OutOfMemoryException as described at that class.
SSOCLIENT_API std::vector<std::pair<std::string, std::string>>
SignHttpRequest(const HttpRequest &request, const SamlToken &token, const Tarvel::Crypto::PrivateKey &identity,
                const HttpSigningOptions &options = {});

/// The header field with a bearer token. Its value is secret: send it only through TLS, do not log it, and overwrite it with
/// `Tarvel::SecureWipe` after use. Safe on any thread.
/// @throws Tarvel::InvalidArgumentException when `token` is a holder-of-key token, or `form` is not valid.
SSOCLIENT_API std::pair<std::string, std::string> MakeTokenHeader(const SamlToken &token, const TokenHeader &form = {});

} // namespace SsoClient
