// SPDX-License-Identifier: Apache-2.0
/// @file
/// What TLS connections may be: versions, cipher suites, groups, signature algorithms, key sizes.

#pragma once

#include <openssl/ssl.h>

namespace Tarvel::Ssl {

/// Sets all of it on a new context, in place of what any configuration of the process has set there. When the machine's
/// configuration is to count, only what that allows beyond our own rules is taken away.
/// @throws Crypto::CryptoException, OutOfMemoryException
void ApplyTlsPolicy(SSL_CTX *context);

} // namespace Tarvel::Ssl
