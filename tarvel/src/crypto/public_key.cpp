// SPDX-License-Identifier: Apache-2.0

#include "crypto/public_key.h"

#include "crypto/certificate_impl.h"
#include "crypto/digest_method.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/openssl_handles.h"
#include "crypto/prepared_key.h"
#include "crypto/private_key_impl.h"
#include "crypto/provider_turn.h"
#include "crypto/verifying_key_impl.h"

#include <openssl/provider.h>
#include <openssl/rsa.h>

#include <string>
#include <utility>

namespace Tarvel::Crypto {

namespace {

constexpr unsigned BITS_PER_BYTE = 8;

bool IsRsaScheme(SignatureScheme scheme) {
  return scheme != SignatureScheme::ECDSA;
}

bool IsCurve(KeyKind kind) {
  return kind == KeyKind::EC_P256 || kind == KeyKind::EC_P384 || kind == KeyKind::EC_P521;
}

bool MatchesScheme(KeyKind kind, SignatureScheme scheme) {
  return IsRsaScheme(scheme) ? kind == KeyKind::RSA : IsCurve(kind);
}

// The number of octets of the modulus, or of each of r and s: the size in bits, rounded up to whole octets (66 for
// P-521).
std::size_t BytesOf(unsigned bits) {
  return (bits + BITS_PER_BYTE - 1) / BITS_PER_BYTE;
}

// The settings that follow EVP_PKEY_sign_init or EVP_PKEY_verify_init.
bool SetScheme(EVP_PKEY_CTX *context, SignatureScheme scheme, DigestAlgorithm algorithm) {
  const EVP_MD *const method = GetDigestMethod(algorithm);
  if (EVP_PKEY_CTX_set_signature_md(context, method) <= 0) {
    return false;
  }
  switch (scheme) {
  case SignatureScheme::RSA_PKCS1:
    return EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PADDING) > 0;
  case SignatureScheme::RSA_PSS:
    return EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PSS_PADDING) > 0 &&
           EVP_PKEY_CTX_set_rsa_mgf1_md(context, method) > 0 &&
           EVP_PKEY_CTX_set_rsa_pss_saltlen(context, RSA_PSS_SALTLEN_DIGEST) > 0;
  case SignatureScheme::ECDSA:
    break;
  }
  return true;
}

// Each context has its own copy of the key: OpenSSL locks a key during each use, and threads would wait for each other.
KeyContextHandle NewVerifyContext(EVP_PKEY *sharedKey, SignatureScheme scheme, DigestAlgorithm algorithm) {
  const OpenSslErrorScope errors;
  const KeyHandle key(EVP_PKEY_dup(sharedKey));
  if (!key) {
    errors.Throw("Failed to set up a signature check");
  }
  KeyContextHandle context(EVP_PKEY_CTX_new_from_pkey(GetLibraryContext(), key.get(), nullptr));
  if (!context || EVP_PKEY_verify_init(context.get()) <= 0 || !SetScheme(context.get(), scheme, algorithm)) {
    errors.Throw("Failed to set up a signature check");
  }
  return context;
}

// Prefers the provider of the key. By default, OpenSSL 3.0 uses the first provider that has the algorithm, such as the default
// one, and gives it what can be exported of the key. Of a key in a TPM, this is only the public part.
std::string PreferOwnProvider(const EVP_PKEY *key) {
  const OSSL_PROVIDER *const provider = EVP_PKEY_get0_provider(key);
  return provider ? std::string("?provider=") + OSSL_PROVIDER_get0_name(provider) : "";
}

KeyContextHandle NewSignContext(EVP_PKEY *key, SignatureScheme scheme, DigestAlgorithm algorithm) {
  const OpenSslErrorScope errors;
  KeyContextHandle context(EVP_PKEY_CTX_new_from_pkey(GetLibraryContext(), key, PreferOwnProvider(key).c_str()));
  if (!context || EVP_PKEY_sign_init(context.get()) <= 0 || !SetScheme(context.get(), scheme, algorithm)) {
    errors.Throw("Failed to set up a signature");
  }
  return context;
}

BignumHandle ReadNumber(const std::uint8_t *bytes, std::size_t length) {
  return BignumHandle(BN_bin2bn(bytes, static_cast<int>(length), nullptr));
}

// OpenSSL expects an ECDSA value as a DER sequence of r and s; XML Signature has their octets one after the other.
std::vector<std::uint8_t> EncodeEcdsaValue(const std::uint8_t *value, std::size_t numberBytes) {
  const OpenSslErrorScope errors;
  BignumHandle r = ReadNumber(value, numberBytes);
  BignumHandle s = ReadNumber(value + numberBytes, numberBytes);
  const EcdsaSignatureHandle pair(ECDSA_SIG_new());
  if (!r || !s || !pair || ECDSA_SIG_set0(pair.get(), r.get(), s.get()) != 1) {
    errors.Throw("Failed to encode an ECDSA value");
  }
  static_cast<void>(r.release()); // the pair owns them now
  static_cast<void>(s.release());
  unsigned char *der = nullptr;
  const int length = i2d_ECDSA_SIG(pair.get(), &der);
  const MemoryHandle owner(der);
  if (length <= 0) {
    errors.Throw("Failed to encode an ECDSA value");
  }
  return {der, der + length};
}

std::vector<std::uint8_t> DecodeEcdsaValue(const std::vector<std::uint8_t> &der, std::size_t numberBytes) {
  const OpenSslErrorScope errors;
  const unsigned char *position = der.data();
  const EcdsaSignatureHandle pair(d2i_ECDSA_SIG(nullptr, &position, static_cast<long>(der.size())));
  std::vector<std::uint8_t> value(2 * numberBytes);
  const int width = static_cast<int>(numberBytes);
  if (!pair || BN_bn2binpad(ECDSA_SIG_get0_r(pair.get()), value.data(), width) != width ||
      BN_bn2binpad(ECDSA_SIG_get0_s(pair.get()), value.data() + numberBytes, width) != width) {
    errors.Throw("Failed to decode an ECDSA value");
  }
  return value;
}

bool Verify(EVP_PKEY_CTX *context, DigestAlgorithm algorithm, const std::uint8_t *digest, const std::uint8_t *signature,
            std::size_t signatureLength) {
  const OpenSslErrorScope errors;
  const int answer = EVP_PKEY_verify(context, signature, signatureLength, digest, DigestBytes(algorithm));
  if (answer < 0) {
    errors.Throw("Failed to check a signature");
  }
  if (answer == 0) {
    errors.RequireMemory(); // without memory, OpenSSL also answers "no"
  }
  return answer == 1;
}

} // namespace

const PreparedKey &GetPreparedKey(const Certificate &certificate) {
  return AsImpl(certificate).GetKey();
}

const PreparedKey &GetPreparedKey(const VerifyingKey &key) {
  return AsImpl(key).GetKey();
}

KeyKind GetKeyKind(const Certificate &certificate, unsigned &bits) {
  const PreparedKey &key = GetPreparedKey(certificate);
  bits = key.GetBits();
  return key.GetKind();
}

bool HasAcceptableExponent(const Certificate &certificate) {
  return GetPreparedKey(certificate).HasAcceptableExponent();
}

std::string RefuseKey(const Certificate &certificate) {
  return RefuseKey(GetPreparedKey(certificate));
}

std::string RefuseKey(const PreparedKey &key) {
  return RefuseKey(key.GetKind(), key.GetBits(), key.HasAcceptableExponent());
}

std::string RefuseKey(KeyKind kind, unsigned bits, bool hasAcceptableExponent) {
  if (kind == KeyKind::OTHER) {
    return "the key is neither RSA nor on the curves P-256, P-384 and P-521";
  }
  if (kind == KeyKind::RSA && bits < MIN_RSA_BITS) {
    return "the RSA key has only " + std::to_string(bits) + " bits; " + std::to_string(MIN_RSA_BITS) +
           " are the minimum";
  }
  return hasAcceptableExponent || kind != KeyKind::RSA ? "" : "the RSA key's public exponent is even or 1";
}

bool VerifyDigest(const Certificate &certificate, SignatureScheme scheme, DigestAlgorithm algorithm,
                  const std::uint8_t *digest, const std::uint8_t *signature, std::size_t signatureLength) {
  return VerifyDigest(GetPreparedKey(certificate), scheme, algorithm, digest, signature, signatureLength);
}

bool VerifyDigest(const PreparedKey &key, SignatureScheme scheme, DigestAlgorithm algorithm, const std::uint8_t *digest,
                  const std::uint8_t *signature, std::size_t signatureLength) {
  const std::size_t numberBytes = BytesOf(key.GetBits());
  const std::size_t expectedLength = IsRsaScheme(scheme) ? numberBytes : 2 * numberBytes;
  if (!MatchesScheme(key.GetKind(), scheme) || signatureLength != expectedLength) {
    return false;
  }
  const OpenSslGuard guard;
  guard.Require();
  KeyContexts &contexts = key.GetVerifyContexts();
  KeyContextHandle context = contexts.Acquire(scheme, algorithm);
  if (!context) {
    context = NewVerifyContext(key.GetNative(), scheme, algorithm);
  }
  bool genuine = false;
  if (IsRsaScheme(scheme)) {
    genuine = Verify(context.get(), algorithm, digest, signature, signatureLength);
  } else {
    const std::vector<std::uint8_t> der = EncodeEcdsaValue(signature, numberBytes);
    genuine = Verify(context.get(), algorithm, digest, der.data(), der.size());
  }
  contexts.Return(scheme, algorithm, std::move(context));
  return genuine;
}

std::vector<std::uint8_t> SignDigest(const PrivateKey &key, SignatureScheme scheme, DigestAlgorithm algorithm,
                                     const std::uint8_t *digest) {
  if (key.GetAlgorithm() != (IsRsaScheme(scheme) ? "RSA" : "EC")) {
    throw CryptoException("A key of algorithm " + key.GetAlgorithm() + " cannot make a signature of this scheme");
  }
  const PrivateKeyImpl &impl = AsImpl(key);
  const ProviderTurn turn(impl.IsInAddedProvider()); // before the guard: OpenSSL's clean-up does not wait for a queue
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  KeyContexts &contexts = impl.GetSignContexts();
  KeyContextHandle context = contexts.Acquire(scheme, algorithm);
  if (!context) {
    context = NewSignContext(impl.GetNative(), scheme, algorithm);
  }
  std::size_t length = 0;
  if (EVP_PKEY_sign(context.get(), nullptr, &length, digest, DigestBytes(algorithm)) <= 0) {
    errors.Throw("Failed to set up a signature");
  }
  std::vector<std::uint8_t> value(length);
  if (EVP_PKEY_sign(context.get(), value.data(), &length, digest, DigestBytes(algorithm)) <= 0) {
    errors.Throw("Failed to sign");
  }
  contexts.Return(scheme, algorithm, std::move(context));
  value.resize(length);
  return IsRsaScheme(scheme) ? value : DecodeEcdsaValue(value, BytesOf(key.GetBits()));
}

} // namespace Tarvel::Crypto
