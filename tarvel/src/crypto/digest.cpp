// SPDX-License-Identifier: Apache-2.0

#include "crypto/digest.h"

#include "crypto/digest_method.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_handles.h"

namespace Tarvel::Crypto {

namespace {

// Held to the end of the process: OpenSSL may have cleaned itself up before our own destructors run.
const EVP_MD *FetchDigestMethod(const char *name) {
  const OpenSslErrorScope errors;
  const EVP_MD *const method = EVP_MD_fetch(GetLibraryContext(), name, nullptr);
  if (!method) {
    errors.Throw(std::string("The cryptographic library does not offer ") + name);
  }
  return method;
}

EVP_MD_CTX *AsDigestContext(void *context) {
  return static_cast<EVP_MD_CTX *>(context);
}

} // namespace

const EVP_MD *GetDigestMethod(DigestAlgorithm algorithm) {
  switch (algorithm) {
  case DigestAlgorithm::SHA384: {
    static const EVP_MD *const sha384 = FetchDigestMethod("SHA2-384");
    return sha384;
  }
  case DigestAlgorithm::SHA512: {
    static const EVP_MD *const sha512 = FetchDigestMethod("SHA2-512");
    return sha512;
  }
  case DigestAlgorithm::SHA256:
    break;
  }
  static const EVP_MD *const sha256 = FetchDigestMethod("SHA2-256");
  return sha256;
}

Digest::Digest(DigestAlgorithm algorithm) : m_context(nullptr) {
  OpenSslUse::Prepare();
  m_use.Require();
  const EVP_MD *const method = GetDigestMethod(algorithm);
  const OpenSslErrorScope errors;
  DigestContextHandle context(EVP_MD_CTX_new());
  if (!context || EVP_DigestInit_ex2(context.get(), method, nullptr) != 1) {
    errors.Throw("Failed to begin a digest");
  }
  m_context = context.release();
}

Digest::~Digest() {
  EVP_MD_CTX_free(AsDigestContext(m_context));
}

void Digest::Update(std::string_view bytes) {
  const OpenSslErrorScope errors;
  if (EVP_DigestUpdate(AsDigestContext(m_context), bytes.data(), bytes.size()) != 1) {
    errors.Throw("Failed to compute a digest");
  }
}

void Digest::Finish(std::uint8_t *out) {
  const OpenSslErrorScope errors;
  if (EVP_DigestFinal_ex(AsDigestContext(m_context), out, nullptr) != 1) {
    errors.Throw("Failed to finish a digest");
  }
}

} // namespace Tarvel::Crypto
