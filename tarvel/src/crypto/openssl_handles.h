// SPDX-License-Identifier: Apache-2.0
/// @file
/// Owning handles for OpenSSL's objects. All except two free their object only if OpenSSL has not cleaned itself up.

#pragma once

#include "crypto/openssl_guard.h"

#include <openssl/bio.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pkcs12.h>
#include <openssl/store.h>
#include <openssl/ui.h>
#include <openssl/x509.h>

#include <memory>

namespace Tarvel::Crypto {

/// Frees an object with the OpenSSL function for its type.
template <auto FREE>
struct OpenSslDeleter {
  template <typename T>
  void operator()(T *handle) const noexcept {
    if (const OpenSslGuard guard; guard) {
      FREE(handle);
    } else {
      OpenSslGuard::Abandon(handle);
    }
  }
};

// The following two free without a check whether OpenSSL has cleaned itself up: only for use under an `OpenSslGuard`.
struct OpenSslMemoryDeleter {
  void operator()(unsigned char *memory) const noexcept { OPENSSL_free(memory); }
};

struct CertificateStackDeleter {
  void operator()(STACK_OF(X509) * stack) const noexcept { sk_X509_pop_free(stack, X509_free); }
};

using BignumHandle = std::unique_ptr<BIGNUM, OpenSslDeleter<BN_free>>;
using BioHandle = std::unique_ptr<BIO, OpenSslDeleter<BIO_free_all>>;
using CertificateHandle = std::unique_ptr<X509, OpenSslDeleter<X509_free>>;
using CertificateStackHandle = std::unique_ptr<STACK_OF(X509), CertificateStackDeleter>;
using DigestContextHandle = std::unique_ptr<EVP_MD_CTX, OpenSslDeleter<EVP_MD_CTX_free>>;
using EcdsaSignatureHandle = std::unique_ptr<ECDSA_SIG, OpenSslDeleter<ECDSA_SIG_free>>;
using EncryptedKeyHandle = std::unique_ptr<X509_SIG, OpenSslDeleter<X509_SIG_free>>;
using KeyContextHandle = std::unique_ptr<EVP_PKEY_CTX, OpenSslDeleter<EVP_PKEY_CTX_free>>;
using KeyHandle = std::unique_ptr<EVP_PKEY, OpenSslDeleter<EVP_PKEY_free>>;
using MemoryHandle = std::unique_ptr<unsigned char, OpenSslMemoryDeleter>;
using Pkcs12Handle = std::unique_ptr<PKCS12, OpenSslDeleter<PKCS12_free>>;
using PlainKeyHandle = std::unique_ptr<PKCS8_PRIV_KEY_INFO, OpenSslDeleter<PKCS8_PRIV_KEY_INFO_free>>;
using StoreHandle = std::unique_ptr<OSSL_STORE_CTX, OpenSslDeleter<OSSL_STORE_close>>;
using StoreInfoHandle = std::unique_ptr<OSSL_STORE_INFO, OpenSslDeleter<OSSL_STORE_INFO_free>>;
using UiMethodHandle = std::unique_ptr<UI_METHOD, OpenSslDeleter<UI_destroy_method>>;

} // namespace Tarvel::Crypto
