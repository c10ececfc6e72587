// SPDX-License-Identifier: Apache-2.0
/// @file
/// `VerifyTlsProof`, for services with mutual TLS.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/saml_token.h>
#include <tarvel/crypto/certificate.h>

namespace SsoClient {

/// Checks that the sender of a holder-of-key token has its key: the key of `peerCertificate`, with which the sender
/// authenticated in the TLS handshake, is the key of the token. The keys are compared, not the certificates, so neither dates
/// nor issuer of `peerCertificate` matter here. The TLS server decides how strong the key must be. Safe on any thread.
/// @param token a verified token. If this library has not made it, it must have a certificate.
/// @param peerCertificate from the completed handshake, and not from a header that a sender can write
/// @throws InvalidProofException when it is another key.
/// @throws Tarvel::InvalidArgumentException for a bearer token.
/// @throws Tarvel::TypeMismatchException for a certificate that this library has not made.
/// @throws Tarvel::OutOfMemoryException and Tarvel::InvalidStateException as described at
///         `Tarvel::Crypto::CryptoException`.
SSOCLIENT_API void VerifyTlsProof(const SamlToken &token, const Tarvel::Crypto::Certificate &peerCertificate);

} // namespace SsoClient
