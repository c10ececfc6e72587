// SPDX-License-Identifier: Apache-2.0
/// @file
/// What TLS connections may use: versions, cipher suites, groups, signature algorithms, key sizes.

#pragma once

#include <openssl/ssl.h>

namespace Tarvel::Ssl {

/// Sets the whole policy of a new context, and replaces what a configuration of the process has set there. If the
/// machine's configuration is in use, it stays, and only what it allows beyond this library's rules is removed.
/// @throws Crypto::CryptoException, OutOfMemoryException
void ApplyTlsPolicy(SSL_CTX *context);

} // namespace Tarvel::Ssl
