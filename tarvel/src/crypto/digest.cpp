// SPDX-License-Identifier: Apache-2.0

#include "crypto/digest.h"

#include "crypto/digest_method.h"
#include "crypto/kept_contexts.h"
#include "crypto/library_context.h"
#include "crypto/openssl_handles.h"

#include <utility>

namespace Tarvel::Crypto {

namespace {

// Never freed: OpenSSL may have cleaned itself up before static objects are destroyed.
const EVP_MD *FetchDigestMethod(const char *name) {
  const OpenSslErrorScope errors;
  const EVP_MD *const method = EVP_MD_fetch(GetLibraryContext(), name, nullptr);
  if (!method) {
    errors.Throw(std::string("The cryptographic library does not offer ") + name);
  }
  return method;
}

// Only for SHA-256, which nearly all digests use. A finished context contains nothing of the message: OpenSSL wipes it.
constinit KeptContexts<DigestContextHandle, 1> keptContexts;

bool IsKept(DigestAlgorithm algorithm) {
  return algorithm == DigestAlgorithm::SHA256;
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

Digest::Digest(DigestAlgorithm algorithm) : m_algorithm(algorithm), m_context(nullptr) {
  OpenSslGuard::Prepare();
  m_guard.Require();
  m_errors.emplace();
  const EVP_MD *const method = GetDigestMethod(algorithm);
  DigestContextHandle context = IsKept(algorithm) ? keptContexts.Acquire(0) : nullptr;
  if (!context) {
    context.reset(EVP_MD_CTX_new());
  }
  if (!context || EVP_DigestInit_ex2(context.get(), method, nullptr) != 1) {
    m_errors->Throw("Failed to begin a digest");
  }
  m_context = context.release();
}

// An unfinished context may contain part of the message. It is not kept but freed, and OpenSSL wipes what it frees.
Digest::~Digest() {
  EVP_MD_CTX_free(AsDigestContext(m_context));
}

void Digest::Update(std::string_view bytes) {
  if (EVP_DigestUpdate(AsDigestContext(m_context), bytes.data(), bytes.size()) != 1) {
    m_errors->Throw("Failed to compute a digest");
  }
}

void Digest::Finish(std::uint8_t *out) {
  if (EVP_DigestFinal_ex(AsDigestContext(m_context), out, nullptr) != 1) {
    m_errors->Throw("Failed to finish a digest");
  }
  if (IsKept(m_algorithm)) {
    keptContexts.Return(0, DigestContextHandle(AsDigestContext(std::exchange(m_context, nullptr))));
  }
}

} // namespace Tarvel::Crypto
