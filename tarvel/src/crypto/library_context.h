// SPDX-License-Identifier: Apache-2.0
/// @file
/// The library context in which all of OpenSSL is used here, so that no configuration from outside changes what is accepted.

#pragma once

#include <openssl/types.h>

namespace Tarvel::Crypto {

/// For every function of OpenSSL that takes a library context. Null, which means OpenSSL's default one, before
/// `OpenSslUse::Prepare`, and when the machine's configuration is to count. Costs one load.
OSSL_LIB_CTX *GetLibraryContext() noexcept;

/// Whether the host has asked for the machine's configuration. Final after `OpenSslUse::Prepare`.
bool UsesSystemConfiguration() noexcept;

/// For `OpenSslUse::Prepare`, once. @throws OutOfMemoryException, CryptoException
void InitialiseOpenSsl();

/// Around functions that take no library context, on the calling thread.
class LibraryContextScope {
public:
  LibraryContextScope() noexcept;
  LibraryContextScope(const LibraryContextScope &) = delete;
  LibraryContextScope &operator=(const LibraryContextScope &) = delete;
  ~LibraryContextScope();

private:
  OSSL_LIB_CTX *m_ofHost = nullptr;
};

} // namespace Tarvel::Crypto
