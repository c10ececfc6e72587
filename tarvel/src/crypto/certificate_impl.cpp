// SPDX-License-Identifier: Apache-2.0

#include "crypto/certificate_impl.h"

#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"

#include <tarvel/core/ref.h>

#include <openssl/bn.h>
#include <openssl/core_names.h>
#include <openssl/pem.h>

#include <array>
#include <chrono>
#include <ctime>
#include <limits>
#include <string>
#include <typeinfo>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t MAX_CURVE_NAME_BYTES = 80;

CertificateHandle Decode(const std::vector<std::uint8_t> &der) {
  OpenSslGuard::Prepare();
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  if (der.empty() || der.size() > static_cast<std::size_t>(std::numeric_limits<long>::max())) {
    throw CryptoException("Certificate of " + std::to_string(der.size()) + " bytes does not decode");
  }
  const unsigned char *position = der.data();
  X509 *blank = X509_new_ex(GetLibraryContext(), nullptr);
  if (!blank) {
    throw OutOfMemoryException();
  }
  CertificateHandle native(d2i_X509(&blank, &position, static_cast<long>(der.size()))); // frees `blank` on failure
  if (!native) {
    errors.Throw("Certificate does not decode");
  }
  // No key, or a key without a size, means an algorithm that OpenSSL does not know, or a lack of memory.
  EVP_PKEY *const key = X509_get0_pubkey(native.get());
  if (!key || EVP_PKEY_get_bits(key) <= 0) {
    errors.RequireMemory();
  }
  if (position != der.data() + der.size()) {
    throw CryptoException("Certificate is followed by " + std::to_string(der.data() + der.size() - position) +
                          " further bytes");
  }
  return native;
}

// OpenSSL also reads BER. Code that compares bytes would treat two encodings of one certificate as two certificates.
void RequireCanonical(X509 *native, const std::vector<std::uint8_t> &der) {
  const OpenSslErrorScope errors;
  i2d_re_X509_tbs(native, nullptr); // makes i2d_X509 encode again instead of returning the bytes that were read
  unsigned char *encoded = nullptr;
  const int length = i2d_X509(native, &encoded);
  const MemoryHandle owner(encoded);
  if (length < 0) {
    errors.Throw("Certificate does not encode");
  }
  if (!std::equal(der.begin(), der.end(), encoded, encoded + length)) {
    throw CryptoException("Certificate is not in the distinguished encoding (DER)");
  }
}

std::int64_t ToUtcMicroseconds(const ASN1_TIME *time) {
  const OpenSslErrorScope errors;
  std::tm fields{};
  if (!time || ASN1_TIME_to_tm(time, &fields) != 1) {
    errors.Throw("Certificate has a malformed validity date");
  }
  using namespace std::chrono;
  const sys_days day = year(fields.tm_year + 1900) / month(static_cast<unsigned>(fields.tm_mon + 1)) /
                       std::chrono::day(static_cast<unsigned>(fields.tm_mday));
  const auto instant = day + hours(fields.tm_hour) + minutes(fields.tm_min) + seconds(fields.tm_sec);
  return duration_cast<microseconds>(instant.time_since_epoch()).count();
}

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

KeyKind FindKeyKind(EVP_PKEY *key) {
  if (!key) {
    return KeyKind::OTHER;
  }
  if (EVP_PKEY_is_a(key, "RSA")) {
    return KeyKind::RSA;
  }
  return EVP_PKEY_is_a(key, "EC") ? FindCurve(key) : KeyKind::OTHER;
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

std::string CopyBioText(BIO *bio) {
  char *text = nullptr;
  const long length = BIO_get_mem_data(bio, &text);
  return length > 0 ? std::string(text, static_cast<std::size_t>(length)) : std::string();
}

BioHandle NewMemoryBio() {
  BioHandle bio(BIO_new(BIO_s_mem()));
  if (!bio) {
    throw OutOfMemoryException();
  }
  return bio;
}

std::string DescribeName(const X509_NAME *name) {
  // RFC 2253 allows UTF-8, but OpenSSL's flags for RFC 2253 would escape every byte beyond ASCII.
  constexpr unsigned long FLAGS = XN_FLAG_RFC2253 & ~static_cast<unsigned long>(ASN1_STRFLGS_ESC_MSB);
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const BioHandle bio = NewMemoryBio();
  if (X509_NAME_print_ex(bio.get(), name, 0, FLAGS) < 0) {
    errors.Throw("Distinguished name cannot be written");
  }
  return CopyBioText(bio.get());
}

} // namespace

CertificateImpl::CertificateImpl(const std::uint8_t *data, std::size_t length)
    : m_der(data, data + length), m_native(Decode(m_der)) {
  const OpenSslGuard guard;
  guard.Require();
  RequireCanonical(m_native.get(), m_der);
  m_notBefore = ToUtcMicroseconds(X509_get0_notBefore(m_native.get()));
  m_notAfter = ToUtcMicroseconds(X509_get0_notAfter(m_native.get()));
  const OpenSslErrorScope errors;
  m_nativeKey = X509_get0_pubkey(m_native.get());
  m_keyKind = FindKeyKind(m_nativeKey);
  if (m_keyKind == KeyKind::OTHER) {
    errors.RequireMemory();
  }
  m_keyBits = m_nativeKey ? static_cast<unsigned>(EVP_PKEY_get_bits(m_nativeKey)) : 0;
  m_hasAcceptableExponent = m_keyKind != KeyKind::RSA || HasSoundExponent(m_nativeKey);
}

std::string CertificateImpl::GetSubject() const {
  return DescribeName(X509_get_subject_name(m_native.get()));
}

std::string CertificateImpl::GetIssuer() const {
  return DescribeName(X509_get_issuer_name(m_native.get()));
}

std::string CertificateImpl::GetSha256Thumbprint() const {
  constexpr std::string_view HEX_DIGITS = "0123456789abcdef";
  std::array<std::uint8_t, DigestBytes(DigestAlgorithm::SHA256)> digest{};
  Digest sha256(DigestAlgorithm::SHA256);
  sha256.Update(std::string_view(reinterpret_cast<const char *>(m_der.data()), m_der.size()));
  sha256.Finish(digest.data());
  std::string text;
  text.reserve(digest.size() * 2);
  for (const std::uint8_t byte : digest) {
    text.push_back(HEX_DIGITS[byte >> 4]);
    text.push_back(HEX_DIGITS[byte & 0x0f]);
  }
  return text;
}

std::string CertificateImpl::ToPem() const {
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const BioHandle bio = NewMemoryBio();
  if (PEM_write_bio_X509(bio.get(), m_native.get()) != 1) {
    errors.Throw("Certificate cannot be written as PEM");
  }
  return CopyBioText(bio.get());
}

bool IsExponentSound(const BIGNUM *exponent) noexcept {
  return BN_is_odd(exponent) && !BN_is_one(exponent) && !BN_is_negative(exponent);
}

const CertificateImpl &AsImpl(const Certificate &certificate) {
  if (typeid(certificate) != typeid(CertificateImpl)) { // a final class: cheaper than a dynamic cast
    ThrowTypeMismatch(typeid(CertificateImpl).name(), typeid(certificate).name());
  }
  return static_cast<const CertificateImpl &>(certificate);
}

} // namespace Tarvel::Crypto
