// SPDX-License-Identifier: Apache-2.0
/// @file
/// Whether the machine's configuration of OpenSSL counts for this library.

#pragma once

#include <tarvel/core/export.h>

namespace Tarvel::Crypto {

/// From now on, certificates, keys, signatures and TLS use OpenSSL as the machine has configured it: `openssl.cnf`, or the
/// file that the environment variable OPENSSL_CONF names, with its providers (FIPS, PKCS#11, TPM), its properties and its TLS
/// settings. Without this call nothing of that is read, and nothing of it counts, also when the host program has it loaded.
///
/// TLS then offers what both the machine and this library allow: a higher minimum version, a higher security level and a
/// shorter list of cipher suites stay as the machine has them, and TLS 1.2, level 2 and forward secrecy stay required.
///
/// To be called before the first certificate, key, signature, token or TLS context. Any number of times, on any thread.
/// @throws InvalidStateException when it comes too late, or when OpenSSL has cleaned itself up.
/// @throws CryptoException when OpenSSL refuses the configuration. By default it passes over what it cannot load;
///         `config_diagnostics = 1` in the file makes it strict.
/// @throws OutOfMemoryException
TARVEL_API void UseSystemConfiguration();

} // namespace Tarvel::Crypto
