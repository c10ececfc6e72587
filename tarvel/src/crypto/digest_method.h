// SPDX-License-Identifier: Apache-2.0
/// @file
/// OpenSSL's implementation of each digest algorithm, looked up once per process.

#pragma once

#include "crypto/digest.h"

#include <openssl/types.h>

namespace Tarvel::Crypto {

/// OpenSSL's implementation of `algorithm`, never null and never freed. Safe on any thread; after the first call it
/// costs one load.
/// @throws CryptoException when the cryptographic library does not offer the algorithm.
const EVP_MD *GetDigestMethod(DigestAlgorithm algorithm);

} // namespace Tarvel::Crypto
