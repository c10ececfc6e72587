// SPDX-License-Identifier: Apache-2.0

#include "crypto/private_key_impl.h"

#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/provider_turn.h"
#include "crypto/subject_public_key_der.h"

#include <typeinfo>
#include <utility>

namespace Tarvel::Crypto {

PrivateKeyImpl::PrivateKeyImpl(KeyHandle native)
    : m_isInAddedProvider(Crypto::IsInAddedProvider(native.get())), m_native(std::move(native)) {
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  m_bits = static_cast<unsigned>(EVP_PKEY_get_bits(m_native.get()));
  if (m_bits == 0) { // OpenSSL sets the size when it reads a key; if memory runs out, the size stays 0 without an error
    throw OutOfMemoryException();
  }
  for (const char *const algorithm : {"RSA", "EC"}) {
    if (EVP_PKEY_is_a(m_native.get(), algorithm)) {
      m_algorithm = algorithm;
      return;
    }
  }
  errors.RequireMemory();
  const char *const algorithm = EVP_PKEY_get0_type_name(m_native.get());
  throw CryptoException(std::string("Private key of algorithm ") + (algorithm ? algorithm : "unknown") +
                        ", which is neither RSA nor EC");
}

PrivateKeyImpl::~PrivateKeyImpl() {
  if (const VerifyingKey *const publicKey = m_publicKey.load()) {
    publicKey->Release();
  }
  const ProviderTurn turn(m_isInAddedProvider); // a provider may have to remove the key from its hardware
  m_signContexts.Clear();
  m_native.reset();
}

// A key of a provider may have no readable private numbers. Its public numbers are encoded and decoded again, so that the
// result is an ordinary key.
Ref<const VerifyingKey> PrivateKeyImpl::GetPublicKey() const {
  if (const VerifyingKey *const kept = m_publicKey.load(std::memory_order_acquire)) {
    return Ref<const VerifyingKey>(kept);
  }
  const auto der = [&] {
    const ProviderTurn turn(m_isInAddedProvider);
    const OpenSslGuard guard;
    guard.Require();
    const OpenSslErrorScope errors;
    return EncodeDer<const EVP_PKEY *>(i2d_PUBKEY, m_native.get(), errors);
  }();
  Ref<const VerifyingKey> made = CreateVerifyingKey(der);
  const VerifyingKey *expected = nullptr;
  if (m_publicKey.compare_exchange_strong(expected, made.get(), std::memory_order_acq_rel)) {
    made->AddRef();
  }
  return made;
}

const PrivateKeyImpl &AsImpl(const PrivateKey &key) {
  const auto *const impl = dynamic_cast<const PrivateKeyImpl *>(&key);
  if (!impl) {
    ThrowTypeMismatch(typeid(PrivateKeyImpl).name(), typeid(key).name());
  }
  return *impl;
}

} // namespace Tarvel::Crypto
