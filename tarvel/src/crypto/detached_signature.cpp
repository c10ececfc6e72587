// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/detached_signature.h>

#include "crypto/public_key.h"
#include "crypto/verifying_key_impl.h"

namespace Tarvel::Crypto {

namespace {

SignatureScheme SchemeOf(bool isRsa) {
  return isRsa ? SignatureScheme::RSA_PKCS1 : SignatureScheme::ECDSA;
}

} // namespace

std::vector<std::uint8_t> SignOctets(const PrivateKey &key, HashAlgorithm algorithm, std::string_view bytes) {
  const std::vector<std::uint8_t> digest = ComputeDigest(algorithm, bytes);
  return SignDigest(key, SchemeOf(key.GetAlgorithm() == "RSA"), algorithm, digest.data());
}

bool VerifyOctets(const VerifyingKey &key, HashAlgorithm algorithm, std::string_view bytes,
                  const std::vector<std::uint8_t> &signature) {
  const PreparedKey &prepared = AsImpl(key).GetKey();
  if (!RefuseKey(prepared).empty()) {
    return false;
  }
  const std::vector<std::uint8_t> digest = ComputeDigest(algorithm, bytes);
  return VerifyDigest(prepared, SchemeOf(prepared.GetKind() == KeyKind::RSA), algorithm, digest.data(),
                      signature.data(), signature.size());
}

} // namespace Tarvel::Crypto
