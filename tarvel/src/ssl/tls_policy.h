// SPDX-License-Identifier: Apache-2.0
/// @file
/// What TLS connections may use: versions, cipher suites, groups, signature algorithms, key sizes.

#pragma once

#include <openssl/ssl.h>

namespace Tarvel::Ssl {

/// Sets the policy of a new context. If the machine's configuration is in use, it stays, and only what it allows beyond
/// this library's rules is removed. Otherwise the library's whole policy replaces what OpenSSL's configuration has set.
/// @throws Crypto::CryptoException, OutOfMemoryException
void ApplyTlsPolicy(SSL_CTX *context);

} // namespace Tarvel::Ssl
