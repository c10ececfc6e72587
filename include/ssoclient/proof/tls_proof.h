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
/// authenticated in the TLS handshake, is the key of the token. (...)
/// @throws InvalidProofException when it is another key.
/// @throws Tarvel::InvalidArgumentException for a bearer token.
SSOCLIENT_API void VerifyTlsProof(const SamlToken &token, const Tarvel::Crypto::Certificate &peerCertificate);

} // namespace SsoClient
