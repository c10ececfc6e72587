// SPDX-License-Identifier: Apache-2.0
/// @file
/// Applying the machine's configuration of OpenSSL to this library.

#pragma once

#include <tarvel/core/export.h>

namespace Tarvel::Crypto {

/// From now on, certificates, keys, signatures and TLS use OpenSSL as the machine has configured it: by `openssl.cnf`, or by
/// the file that the environment variable OPENSSL_CONF refers to, with its providers (FIPS, PKCS#11, TPM), its properties and
/// its TLS settings. Without this call, that configuration is neither read nor applied, even if the host has loaded it.
///
/// TLS then offers what both the machine and this library allow: the machine may set a higher minimum version, a higher
/// security level or a shorter list of cipher suites; TLS 1.2, level 2 and forward secrecy remain required.
///
/// Call this before the first certificate, key, signature, token or TLS context. It may be called any number of times,
/// on any thread.
/// @throws InvalidStateException when it is called too late, or when OpenSSL has cleaned itself up.
/// @throws CryptoException when OpenSSL refuses the configuration. By default OpenSSL skips what it cannot load;
///         `config_diagnostics = 1` in the file makes it strict.
/// @throws OutOfMemoryException
TARVEL_API void UseSystemConfiguration();

} // namespace Tarvel::Crypto
