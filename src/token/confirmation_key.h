// SPDX-License-Identifier: Apache-2.0
/// @file
/// The key of a holder-of-key token.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/verifying_key.h>

namespace SsoClient {

/// The key whose possession the sender of `token` must prove: that of its certificate, or the key value of its used
/// confirmation. It may be a key with which no signature is accepted (`VerifyingKey::GetRefusal`). Null for a bearer token.
/// Also null for a token without a certificate that this library has not made, because only the library's own tokens have a
/// key value. Does not read the token's text.
/// @throws what `CreateVerifyingKey` throws.
Tarvel::Ref<const Tarvel::Crypto::VerifyingKey> GetConfirmationKey(const SamlToken &token);

} // namespace SsoClient
