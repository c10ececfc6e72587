// SPDX-License-Identifier: Apache-2.0
/// @file
/// The key of a holder-of-key token.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/verifying_key.h>

namespace SsoClient {

/// The key whose possession the sender of `token` must prove: that of its certificate, or the key value of its used
/// confirmation. Null for a bearer token, and for a holder-of-key token without a key that can be used.
Tarvel::Ref<const Tarvel::Crypto::VerifyingKey> GetConfirmationKey(const SamlToken &token);

} // namespace SsoClient
