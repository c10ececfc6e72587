// SPDX-License-Identifier: Apache-2.0

#include "crypto/prepared_key.h"

#include "crypto/openssl_errors.h"

#include <openssl/bn.h>
#include <openssl/core_names.h>

#include <array>
#include <string_view>
#include <utility>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t MAX_CURVE_NAME_BYTES = 80;

KeyKind FindCurve(EVP_PKEY *key) {
  std::array<char, MAX_CURVE_NAME_BYTES> name{};
  const OpenSslErrorScope errors;
  if (EVP_PKEY_get_group_name(key, name.data(), name.size(), nullptr) != 1) {
    errors.RequireMemory();
    return KeyKind::OTHER;
  }
  const std::string_view curve = name.data();
  if (curve == "prime256v1") {
    return KeyKind::EC_P256;
  }
  if (curve == "secp384r1") {
    return KeyKind::EC_P384;
  }
  return curve == "secp521r1" ? KeyKind::EC_P521 : KeyKind::OTHER;
}

bool HasSoundExponent(EVP_PKEY *key) {
  const OpenSslErrorScope errors;
  BIGNUM *read = nullptr;
  const int isRead = EVP_PKEY_get_bn_param(key, OSSL_PKEY_PARAM_RSA_E, &read);
  const BignumHandle exponent(read);
  if (isRead != 1) {
    errors.Throw("The RSA key's exponent cannot be read");
  }
  return IsExponentSound(exponent.get());
}

} // namespace

PreparedKey::PreparedKey(KeyHandle native) : m_native(std::move(native)) {
  EVP_PKEY *const key = m_native.get();
  if (!key) {
    return;
  }
  const OpenSslErrorScope errors;
  m_bits = static_cast<unsigned>(EVP_PKEY_get_bits(key));
  if (EVP_PKEY_is_a(key, "RSA")) {
    m_algorithm = "RSA";
    m_kind = KeyKind::RSA;
    m_hasAcceptableExponent = HasSoundExponent(key);
  } else if (EVP_PKEY_is_a(key, "EC")) {
    m_algorithm = "EC";
    m_kind = FindCurve(key);
  }
  if (m_kind == KeyKind::OTHER) {
    errors.RequireMemory();
  }
}

bool IsExponentSound(const BIGNUM *exponent) noexcept {
  return BN_is_odd(exponent) && !BN_is_one(exponent) && !BN_is_negative(exponent);
}

} // namespace Tarvel::Crypto
