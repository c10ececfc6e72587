// SPDX-License-Identifier: Apache-2.0

#include "crypto/certificate_impl.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/private_key_impl.h"
#include "crypto/subject_public_key_der.h"
#include "crypto/thumbprint.h"
#include "crypto/verifying_key_impl.h"

#include <tarvel/crypto/subject_public_key.h>

#include <algorithm>
#include <limits>
#include <typeinfo>
#include <utility>

namespace Tarvel::Crypto {

namespace {

using PublicKeyInfoHandle = std::unique_ptr<X509_PUBKEY, OpenSslDeleter<X509_PUBKEY_free>>;

PublicKeyInfoHandle Decode(const std::vector<std::uint8_t> &der, const OpenSslErrorScope &errors) {
  const std::size_t length = der.size();
  if (length == 0 || length > static_cast<std::size_t>(std::numeric_limits<long>::max())) {
    throw CryptoException("Public key of " + std::to_string(length) + " bytes does not decode");
  }
  const unsigned char *position = der.data();
  X509_PUBKEY *blank = X509_PUBKEY_new_ex(GetLibraryContext(), nullptr);
  if (!blank) {
    throw OutOfMemoryException();
  }
  PublicKeyInfoHandle info(d2i_X509_PUBKEY(&blank, &position, static_cast<long>(length))); // frees `blank` on failure
  if (!info) {
    errors.Throw("Public key does not decode");
  }
  if (position != der.data() + length) {
    throw CryptoException("Public key is followed by " + std::to_string(der.data() + length - position) +
                          " further bytes");
  }
  return info;
}

} // namespace

VerifyingKey::~VerifyingKey() = default;

VerifyingKeyImpl::VerifyingKeyImpl(Ref<const PreparedKey> key, std::vector<std::uint8_t> der)
    : m_key(std::move(key)), m_der(std::move(der)) {}

unsigned VerifyingKeyImpl::GetBits() const noexcept {
  return *m_key->GetAlgorithm() != '\0' ? m_key->GetBits() : 0;
}

std::string VerifyingKeyImpl::GetSha256Thumbprint() const {
  return MakeSha256Thumbprint(m_der);
}

const VerifyingKeyImpl &AsImpl(const VerifyingKey &key) {
  if (typeid(key) != typeid(VerifyingKeyImpl)) { // a final class: cheaper than a dynamic cast
    ThrowTypeMismatch(typeid(VerifyingKeyImpl).name(), typeid(key).name());
  }
  return static_cast<const VerifyingKeyImpl &>(key);
}

Ref<const VerifyingKey> CreateVerifyingKey(const std::vector<std::uint8_t> &subjectPublicKeyInfo) {
  OpenSslGuard::Prepare();
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const PublicKeyInfoHandle info = Decode(subjectPublicKeyInfo, errors);
  KeyHandle native(X509_PUBKEY_get(info.get()));
  if (!native) {
    errors.Throw("Public key does not decode");
  }
  // OpenSSL also reads BER. Code that compares bytes would treat two encodings of one key as two keys.
  if (EncodeDer<const X509_PUBKEY *>(i2d_X509_PUBKEY, info.get(), errors) != subjectPublicKeyInfo) {
    throw CryptoException("Public key is not in the distinguished encoding (DER)");
  }
  return MakeRef<VerifyingKeyImpl>(MakeRef<PreparedKey>(std::move(native)), subjectPublicKeyInfo);
}

Ref<const VerifyingKey> CreateVerifyingKey(const Ref<const Certificate> &certificate) {
  return MakeRef<VerifyingKeyImpl>(AsImpl(*certificate).ShareKey(), GetSubjectPublicKey(*certificate));
}

Ref<const VerifyingKey> CreateVerifyingKey(const PrivateKey &key) {
  return AsImpl(key).GetPublicKey();
}

bool IsSameKey(const VerifyingKey &left, const VerifyingKey &right) {
  if (left.GetSubjectPublicKey() == right.GetSubjectPublicKey()) {
    return true;
  }
  EVP_PKEY *const leftKey = AsImpl(left).GetKey().GetNative();
  EVP_PKEY *const rightKey = AsImpl(right).GetKey().GetNative();
  if (!leftKey || !rightKey) {
    return false;
  }
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  if (EVP_PKEY_eq(leftKey, rightKey) == 1) {
    return true;
  }
  errors.RequireMemory();
  return false;
}

} // namespace Tarvel::Crypto
