// SPDX-License-Identifier: Apache-2.0
/// @file
/// Encoding public keys in DER.

#pragma once

#include "crypto/openssl_errors.h"
#include "crypto/openssl_handles.h"

#include <cstdint>
#include <vector>

namespace Tarvel::Crypto {

/// What OpenSSL's function `encode` (of the kind `i2d`) writes for `object`. `errors` is a scope around the call.
/// @throws CryptoException when the object does not encode; OutOfMemoryException. Use under an `OpenSslGuard`.
template <typename Object>
std::vector<std::uint8_t> EncodeDer(int (*encode)(Object, unsigned char **), Object object,
                                    const OpenSslErrorScope &errors) {
  unsigned char *der = nullptr;
  const int length = encode(object, &der);
  const MemoryHandle owner(der);
  if (length <= 0) {
    errors.Throw("Public key does not encode");
  }
  return {der, der + length};
}

} // namespace Tarvel::Crypto
