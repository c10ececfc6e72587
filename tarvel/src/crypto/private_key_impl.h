// SPDX-License-Identifier: Apache-2.0
/// @file
/// The only implementation of `PrivateKey`, based on OpenSSL.

#pragma once

#include "crypto/key_contexts.h"
#include "crypto/openssl_handles.h"

#include <tarvel/crypto/private_key.h>
#include <tarvel/crypto/verifying_key.h>

#include <atomic>

namespace Tarvel::Crypto {

class PrivateKeyImpl final : public PrivateKey {
public:
  /// @throws CryptoException when the key is neither RSA nor EC; InvalidStateException when OpenSSL has cleaned itself up;
  ///         OutOfMemoryException.
  explicit PrivateKeyImpl(KeyHandle native);

  std::string GetAlgorithm() const override { return m_algorithm; }
  unsigned GetBits() const override { return m_bits; }
  /// Whether each use of the key needs a `ProviderTurn`.
  bool IsInAddedProvider() const noexcept { return m_isInAddedProvider; }
  KeyContexts &GetSignContexts() const noexcept { return m_signContexts; }

  /// The public key that belongs to this key. Making it takes nearly as long as a signature, so it is kept after the
  /// first call.
  /// @throws CryptoException when the provider of the key fails; InvalidStateException; OutOfMemoryException.
  Ref<const VerifyingKey> GetPublicKey() const;

  /// Owned by this object; OpenSSL counts its own references to it.
  EVP_PKEY *GetNative() const noexcept { return m_native.get(); }

private:
  ~PrivateKeyImpl() override;

  const char *m_algorithm = nullptr;
  unsigned m_bits = 0;
  bool m_isInAddedProvider = false;
  KeyHandle m_native; // OpenSSL wipes the key's numbers when it frees them
  mutable KeyContexts m_signContexts;
  mutable std::atomic<const VerifyingKey *> m_publicKey{nullptr}; // owns one reference; null until it is made
};

/// Downcasts `key`.
/// @throws TypeMismatchException when it is an instance of another class.
const PrivateKeyImpl &AsImpl(const PrivateKey &key);

} // namespace Tarvel::Crypto
