// SPDX-License-Identifier: Apache-2.0
/// @file
/// The only implementation of `VerifyingKey`, based on OpenSSL.

#pragma once

#include "crypto/prepared_key.h"

#include <tarvel/crypto/verifying_key.h>

namespace Tarvel::Crypto {

class VerifyingKeyImpl final : public VerifyingKey {
public:
  /// @param der the SubjectPublicKeyInfo of `key`, which is not null.
  VerifyingKeyImpl(Ref<const PreparedKey> key, std::vector<std::uint8_t> der);

  const std::vector<std::uint8_t> &GetSubjectPublicKey() const noexcept override { return m_der; }
  std::string GetAlgorithm() const override { return m_key->GetAlgorithm(); }
  unsigned GetBits() const noexcept override;
  std::string GetRefusal() const override { return RefuseKey(*m_key); }
  std::string GetSha256Thumbprint() const override;

  const PreparedKey &GetKey() const noexcept { return *m_key; }

private:
  ~VerifyingKeyImpl() override = default;

  const Ref<const PreparedKey> m_key;
  const std::vector<std::uint8_t> m_der;
};

/// Downcasts `key`.
/// @throws TypeMismatchException when it is an instance of another class.
const VerifyingKeyImpl &AsImpl(const VerifyingKey &key);

} // namespace Tarvel::Crypto
