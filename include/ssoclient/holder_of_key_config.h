// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HolderOfKeyConfig`, the client identity that signs requests and that holder-of-key tokens are bound to.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

namespace SsoClient {

/// A private key and its certificate, both shared with every copy; the certificate is released first, then the key. A
/// service or a negotiation is not created with one that lacks either.
struct HolderOfKeyConfig {
  Tarvel::Ref<const Tarvel::Crypto::PrivateKey> privateKey;   ///< signs requests, by RSA-SHA256: an RSA key
  Tarvel::Ref<const Tarvel::Crypto::Certificate> certificate; ///< sent with signed requests
};

} // namespace SsoClient
