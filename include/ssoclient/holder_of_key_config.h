// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HolderOfKeyConfig`, the client identity that signs requests and to which holder-of-key tokens are bound.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

namespace SsoClient {

/// A private key and its certificate. Copies share both. The certificate is released before the key. Creating a service or a
/// negotiation fails when either is null.
struct HolderOfKeyConfig {
  Tarvel::Ref<const Tarvel::Crypto::PrivateKey> privateKey;   ///< signs requests with RSA-SHA256; an RSA key
  Tarvel::Ref<const Tarvel::Crypto::Certificate> certificate; ///< sent with signed requests
};

} // namespace SsoClient
