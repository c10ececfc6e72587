// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/subject_public_key.h>

#include "crypto/certificate_impl.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"
#include "crypto/subject_public_key_der.h"

#include <openssl/bn.h>
#include <openssl/core_names.h>
#include <openssl/param_build.h>

#include <algorithm>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t BITS_PER_BYTE = 8;
constexpr std::uint8_t UNCOMPRESSED_POINT = 4;

using ParameterBuilderHandle = std::unique_ptr<OSSL_PARAM_BLD, OpenSslDeleter<OSSL_PARAM_BLD_free>>;
using ParametersHandle = std::unique_ptr<OSSL_PARAM, OpenSslDeleter<OSSL_PARAM_free>>;

struct Curve {
  const char *name;
  KeyKind kind;
  std::size_t coordinateBytes;
};

Curve Describe(NamedCurve curve) {
  switch (curve) {
  case NamedCurve::P256:
    return {"P-256", KeyKind::EC_P256, 32};
  case NamedCurve::P384:
    return {"P-384", KeyKind::EC_P384, 48};
  case NamedCurve::P521:
    break;
  }
  return {"P-521", KeyKind::EC_P521, 66};
}

/// The number that the octets are. Null if they have more than `maxBits` bits after the zeros at the beginning.
BignumHandle ReadNumber(const std::vector<std::uint8_t> &octets, std::size_t maxBits) {
  const auto first = std::find_if(octets.begin(), octets.end(), [](std::uint8_t octet) { return octet != 0; });
  const auto count = static_cast<std::size_t>(octets.end() - first);
  if (count > maxBits / BITS_PER_BYTE) {
    return {};
  }
  BignumHandle number(BN_bin2bn(octets.data() + (octets.size() - count), static_cast<int>(count), nullptr));
  if (!number) {
    throw OutOfMemoryException();
  }
  return number;
}

KeyHandle MakeKey(const char *algorithm, OSSL_PARAM *parameters, const OpenSslErrorScope &errors) {
  const KeyContextHandle context(EVP_PKEY_CTX_new_from_name(GetLibraryContext(), algorithm, nullptr));
  EVP_PKEY *made = nullptr;
  if (!context || EVP_PKEY_fromdata_init(context.get()) <= 0 ||
      EVP_PKEY_fromdata(context.get(), &made, EVP_PKEY_PUBLIC_KEY, parameters) <= 0) {
    errors.Throw("The numbers are not a public key");
  }
  return KeyHandle(made);
}

KeyHandle MakeRsaKey(const BIGNUM *modulus, const BIGNUM *exponent, const OpenSslErrorScope &errors) {
  const ParameterBuilderHandle builder(OSSL_PARAM_BLD_new());
  if (!builder || OSSL_PARAM_BLD_push_BN(builder.get(), OSSL_PKEY_PARAM_RSA_N, modulus) != 1 ||
      OSSL_PARAM_BLD_push_BN(builder.get(), OSSL_PKEY_PARAM_RSA_E, exponent) != 1) {
    errors.Throw("The numbers are not a public key");
  }
  const ParametersHandle parameters(OSSL_PARAM_BLD_to_param(builder.get()));
  if (!parameters) {
    errors.Throw("The numbers are not a public key");
  }
  return MakeKey("RSA", parameters.get(), errors);
}

} // namespace

SubjectPublicKey MakeRsaPublicKey(const std::vector<std::uint8_t> &modulus, const std::vector<std::uint8_t> &exponent) {
  OpenSslGuard::Prepare();
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const BignumHandle n = ReadNumber(modulus, MAX_RSA_MODULUS_BITS);
  const BignumHandle e = ReadNumber(exponent, MAX_RSA_EXPONENT_BITS);
  if (!n || !e) {
    const std::size_t limit = n ? MAX_RSA_EXPONENT_BITS : MAX_RSA_MODULUS_BITS;
    return {{},
            std::string("the RSA key's ") + (n ? "exponent" : "modulus") + " has more than " + std::to_string(limit) +
                " bits"};
  }
  const auto bits = static_cast<unsigned>(BN_num_bits(n.get()));
  SubjectPublicKey key;
  key.refusal = RefuseKey(KeyKind::RSA, bits, IsExponentSound(e.get()));
  const KeyHandle native = MakeRsaKey(n.get(), e.get(), errors);
  key.der = EncodeDer<const EVP_PKEY *>(i2d_PUBKEY, native.get(), errors);
  return key;
}

SubjectPublicKey MakeEcPublicKey(NamedCurve curve, const std::vector<std::uint8_t> &point) {
  const Curve described = Describe(curve);
  if (point.size() != 1 + 2 * described.coordinateBytes || point.front() != UNCOMPRESSED_POINT) {
    throw CryptoException("The " + std::to_string(point.size()) + " bytes are not an uncompressed point on " +
                          described.name);
  }
  OpenSslGuard::Prepare();
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const ParameterBuilderHandle builder(OSSL_PARAM_BLD_new());
  if (!builder || OSSL_PARAM_BLD_push_utf8_string(builder.get(), OSSL_PKEY_PARAM_GROUP_NAME, described.name, 0) != 1 ||
      OSSL_PARAM_BLD_push_octet_string(builder.get(), OSSL_PKEY_PARAM_PUB_KEY, point.data(), point.size()) != 1) {
    errors.Throw("The point is not a public key");
  }
  const ParametersHandle parameters(OSSL_PARAM_BLD_to_param(builder.get()));
  if (!parameters) {
    errors.Throw("The point is not a public key");
  }
  const KeyHandle native = MakeKey("EC", parameters.get(), errors);
  return {EncodeDer<const EVP_PKEY *>(i2d_PUBKEY, native.get(), errors), RefuseKey(described.kind, 0, true)};
}

std::vector<std::uint8_t> GetSubjectPublicKey(const Certificate &certificate) {
  return AsImpl(certificate).GetKeyDer();
}

bool HasPublicKey(const Certificate &certificate, const std::vector<std::uint8_t> &subjectPublicKeyInfo) {
  EVP_PKEY *const ofCertificate = AsImpl(certificate).GetNativeKey();
  if (!ofCertificate) {
    return false;
  }
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const unsigned char *position = subjectPublicKeyInfo.data();
  const KeyHandle key(
      d2i_PUBKEY_ex(nullptr, &position, static_cast<long>(subjectPublicKeyInfo.size()), GetLibraryContext(), nullptr));
  if (!key) {
    errors.RequireMemory();
    return false;
  }
  if (EVP_PKEY_eq(ofCertificate, key.get()) == 1) {
    return true;
  }
  errors.RequireMemory();
  return false;
}

} // namespace Tarvel::Crypto
