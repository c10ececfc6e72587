// SPDX-License-Identifier: Apache-2.0
/// @file
/// Private keys in the stores that OpenSSL's loaders open by URI.

#pragma once

#include <tarvel/crypto/private_key.h>

#include <string>

namespace Tarvel::Crypto {

/// Whether `text` begins with a URI scheme (RFC 3986, section 3.1) of two or more characters, followed by a colon. The
/// path of a file with such a name must be written as "./name".
bool IsKeyUri(const std::string &text);

/// @throws NoKeyException, WrongPassphraseException, CryptoException, IOException when `LoadPrivateKey` does, but
/// without the URI in the message.
Ref<const PrivateKey> LoadPrivateKeyFromUri(const std::string &uri, const PassphraseCallback &passphrase);

} // namespace Tarvel::Crypto
