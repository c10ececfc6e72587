// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the `ds:KeyInfo` of a message's signature refers to.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/xml/node.h>

#include <cstdint>

namespace SsoClient {

/// What a `ds:KeyInfo`, or a part of it, refers to.
enum class KeyReferral : std::uint8_t {
  NOTHING,     ///< there is no reference
  TOKEN,       ///< the token, by its identifier or by its key
  OTHER_TOKEN, ///< another SAML token, or this token with a wrong token type
  OTHER_KEY,   ///< something else, such as a certificate with another key
  SEVERAL      ///< the token and something else
};

/// What the key information of `signature` refers to. It selects the signature and nothing else: a signature is always
/// verified with the token's key. A reference to the token is a `wsse:SecurityTokenReference` by the SAML identifier,
/// or by a URI (SAML Token Profile 1.1, section 3.4), or a `ds:X509Data` or `ds:KeyValue` with the token's key.
/// @param key the token's key; null for a bearer token
KeyReferral FindKeyReferral(const Tarvel::Xml::ElementNode &signature, const SamlToken &token,
                            const Tarvel::Crypto::VerifyingKey *key);

} // namespace SsoClient
