// SPDX-License-Identifier: Apache-2.0

#include "crypto/certificate_impl.h"

#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/subject_public_key_der.h"
#include "crypto/thumbprint.h"

#include <tarvel/core/ref.h>

#include <openssl/pem.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <limits>
#include <string>
#include <typeinfo>
#include <utility>

namespace Tarvel::Crypto {

namespace {

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
  KeyHandle key(X509_get_pubkey(m_native.get()));
  if (!key) {
    errors.RequireMemory();
  }
  m_key = MakeRef<PreparedKey>(std::move(key));
  m_keyDer = EncodeDer<const X509_PUBKEY *>(i2d_X509_PUBKEY, X509_get_X509_PUBKEY(m_native.get()), errors);
}

std::string CertificateImpl::GetSubject() const {
  return DescribeName(X509_get_subject_name(m_native.get()));
}

std::string CertificateImpl::GetIssuer() const {
  return DescribeName(X509_get_issuer_name(m_native.get()));
}

std::string CertificateImpl::GetSha256Thumbprint() const {
  return MakeSha256Thumbprint(m_der);
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

const CertificateImpl &AsImpl(const Certificate &certificate) {
  if (typeid(certificate) != typeid(CertificateImpl)) { // a final class: cheaper than a dynamic cast
    ThrowTypeMismatch(typeid(CertificateImpl).name(), typeid(certificate).name());
  }
  return static_cast<const CertificateImpl &>(certificate);
}

} // namespace Tarvel::Crypto
