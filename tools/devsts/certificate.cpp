// SPDX-License-Identifier: Apache-2.0

#include "certificate.h"

#include "base64.h"
#include "digest.h"

#include <openssl/err.h>
#include <openssl/x509_vfy.h>
#include <openssl/x509v3.h>

#include <array>
#include <new>
#include <vector>

namespace DevSts {

namespace {

constexpr int MINIMUM_BITS = 2048;

struct StoreDeleter {
  void operator()(X509_STORE *store) const noexcept { X509_STORE_free(store); }
};
struct StoreContextDeleter {
  void operator()(X509_STORE_CTX *context) const noexcept { X509_STORE_CTX_free(context); }
};

/// `der` has `length` octets, and is freed.
std::vector<unsigned char> TakeDer(unsigned char *der, int length) {
  if (length < 0) {
    throw std::bad_alloc();
  }
  std::vector<unsigned char> copy(der, der + length);
  OPENSSL_free(der);
  return copy;
}

std::vector<unsigned char> DerOf(const X509 &certificate) {
  unsigned char *der = nullptr;
  const int length = i2d_X509(&certificate, &der);
  return TakeDer(der, length);
}

std::vector<unsigned char> DerOf(const X509_PUBKEY &key) {
  unsigned char *der = nullptr;
  const int length = i2d_X509_PUBKEY(&key, &der);
  return TakeDer(der, length);
}

/// The entry of that kind in the name; empty unless there is exactly one.
std::string OnlyEntry(const X509_NAME *name, int kind) {
  const int at = X509_NAME_get_index_by_NID(name, kind, -1);
  if (at < 0 || X509_NAME_get_index_by_NID(name, kind, at) >= 0) {
    return {};
  }
  unsigned char *text = nullptr;
  const int length = ASN1_STRING_to_UTF8(&text, X509_NAME_ENTRY_get_data(X509_NAME_get_entry(name, at)));
  std::string copy(reinterpret_cast<const char *>(text), length > 0 ? static_cast<std::size_t>(length) : 0);
  OPENSSL_free(text);
  return copy;
}

} // namespace

Certificate DecodeCertificate(std::string_view base64) {
  const std::vector<unsigned char> der = DecodeBase64(base64);
  const unsigned char *next = der.data();
  Certificate certificate(der.empty() ? nullptr : d2i_X509(nullptr, &next, static_cast<long>(der.size())));
  ERR_clear_error();
  return certificate && next == der.data() + der.size() ? std::move(certificate) : nullptr;
}

std::string EncodeCertificate(const X509 &certificate) {
  return EncodeBase64(DerOf(certificate));
}

std::string ThumbprintOf(const X509 &certificate) {
  return Sha256Text(DerOf(certificate));
}

std::string KeyThumbprintOf(const X509 &certificate) {
  return Sha256Text(DerOf(*X509_get_X509_PUBKEY(&certificate)));
}

bool HasStrongKey(const X509 &certificate) {
  const EVP_PKEY *const key = X509_get0_pubkey(&certificate);
  return key && EVP_PKEY_get_base_id(key) == EVP_PKEY_RSA && EVP_PKEY_get_bits(key) >= MINIMUM_BITS;
}

bool IsClientOf(X509 &certificate, X509 &authority) {
  // Without the extension, OpenSSL accepts a certificate for any purpose: the token signer's would be accepted as a
  // client's.
  if ((X509_get_extension_flags(&certificate) & EXFLAG_XKUSAGE) == 0) {
    return false;
  }
  const std::unique_ptr<X509_STORE, StoreDeleter> store(X509_STORE_new());
  const std::unique_ptr<X509_STORE_CTX, StoreContextDeleter> context(X509_STORE_CTX_new());
  const bool trusted = store && context && X509_STORE_add_cert(store.get(), &authority) == 1 &&
                       X509_STORE_CTX_init(context.get(), store.get(), &certificate, nullptr) == 1 &&
                       X509_STORE_CTX_set_purpose(context.get(), X509_PURPOSE_SSL_CLIENT) == 1 &&
                       X509_verify_cert(context.get()) == 1;
  ERR_clear_error();
  return trusted;
}

std::string PrincipalOf(const X509 &certificate) {
  const X509_NAME *const subject = X509_get_subject_name(&certificate);
  const std::string name = OnlyEntry(subject, NID_commonName);
  const std::string domain = OnlyEntry(subject, NID_organizationName);
  return name.empty() || domain.empty() ? std::string() : name + "@" + domain;
}

std::string OpenSslErrors() {
  std::string text;
  while (const unsigned long error = ERR_get_error()) {
    std::array<char, 256> line{};
    ERR_error_string_n(error, line.data(), line.size());
    text += (text.empty() ? "" : "; ") + std::string(line.data());
  }
  return text;
}

} // namespace DevSts
