// SPDX-License-Identifier: Apache-2.0
/// @file
/// The OpenSSL library context of this library. With it, configuration of the machine or the host
/// does not change what is accepted.

#pragma once

#include <openssl/types.h>

namespace Tarvel::Crypto {

/// The argument for every OpenSSL function that has a parameter for a library context. It is null, which means
/// OpenSSL's default context, before `OpenSslGuard::Prepare` and if the machine's configuration applies. The call costs
/// one load.
OSSL_LIB_CTX *GetLibraryContext() noexcept;

/// Whether the host has asked for the machine's configuration. Final after `OpenSslGuard::Prepare`.
bool UsesSystemConfiguration() noexcept;

/// Called by `OpenSslGuard::Prepare` until a call has succeeded. @throws OutOfMemoryException, CryptoException;
/// InvalidStateException when OpenSSL has cleaned itself up.
void InitialiseOpenSsl();

/// While it lives, the thread that created it uses our library context in OpenSSL functions without such a parameter.
class LibraryContextScope {
public:
  LibraryContextScope() noexcept;
  LibraryContextScope(const LibraryContextScope &) = delete;
  LibraryContextScope &operator=(const LibraryContextScope &) = delete;
  ~LibraryContextScope();

private:
  OSSL_LIB_CTX *m_hostContext = nullptr;
};

} // namespace Tarvel::Crypto
