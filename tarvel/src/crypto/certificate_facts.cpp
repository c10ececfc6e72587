// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/certificate_facts.h>

#include "crypto/certificate_impl.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/openssl_handles.h"
#include "crypto/public_key.h"

#include <openssl/x509v3.h>

#include <arpa/inet.h>
#include <array>
#include <memory>
#include <utility>

namespace Tarvel::Crypto {

namespace {

struct GeneralNamesDeleter {
  void operator()(GENERAL_NAMES *names) const noexcept { GENERAL_NAMES_free(names); }
};
using GeneralNamesHandle = std::unique_ptr<GENERAL_NAMES, GeneralNamesDeleter>;

std::string TextOf(const ASN1_STRING *string) {
  unsigned char *utf8 = nullptr;
  const int length = ASN1_STRING_to_UTF8(&utf8, string);
  const MemoryHandle owner(utf8);
  return length > 0 ? std::string(reinterpret_cast<const char *>(utf8), static_cast<std::size_t>(length))
                    : std::string();
}

/// Empty for a value that is not an address.
std::string AddressOf(const ASN1_OCTET_STRING *octets) {
  constexpr int V4_BYTES = 4;
  constexpr int V6_BYTES = 16;
  const int length = ASN1_STRING_length(octets);
  std::array<char, INET6_ADDRSTRLEN> text{};
  if (length != V4_BYTES && length != V6_BYTES) {
    return {};
  }
  inet_ntop(length == V4_BYTES ? AF_INET : AF_INET6, ASN1_STRING_get0_data(octets), text.data(), text.size());
  return text.data();
}

void AddName(std::string name, CertificateFacts &facts) {
  if (name.empty()) {
    return;
  }
  ++facts.nameCount;
  if (facts.names.size() < MAX_CERTIFICATE_NAMES) {
    facts.names.push_back(std::move(name));
  }
}

/// Adds the alternative names. @return whether one of them is a host name.
bool AddAlternativeNames(const X509 *certificate, CertificateFacts &facts) {
  const GeneralNamesHandle names(
      static_cast<GENERAL_NAMES *>(X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)));
  bool hasHostName = false;
  for (int i = 0; i < sk_GENERAL_NAME_num(names.get()); ++i) { // -1 without the extension
    const GENERAL_NAME *const name = sk_GENERAL_NAME_value(names.get(), i);
    if (name->type == GEN_DNS) {
      hasHostName = true;
      AddName(TextOf(name->d.dNSName), facts);
    } else if (name->type == GEN_IPADD) {
      AddName(AddressOf(name->d.iPAddress), facts);
    }
  }
  return hasHostName;
}

void AddCommonNames(const X509 *certificate, CertificateFacts &facts) {
  const X509_NAME *const subject = X509_get_subject_name(certificate);
  for (int at = X509_NAME_get_index_by_NID(subject, NID_commonName, -1); at >= 0;
       at = X509_NAME_get_index_by_NID(subject, NID_commonName, at)) {
    AddName(TextOf(X509_NAME_ENTRY_get_data(X509_NAME_get_entry(subject, at))), facts);
  }
}

std::string DescribeKey(const CertificateImpl &certificate) {
  switch (certificate.GetKey().GetKind()) {
  case KeyKind::RSA:
    return "RSA, " + std::to_string(certificate.GetKey().GetBits()) + " bits";
  case KeyKind::EC_P256:
    return "EC, P-256";
  case KeyKind::EC_P384:
    return "EC, P-384";
  case KeyKind::EC_P521:
    return "EC, P-521";
  case KeyKind::OTHER:
    break;
  }
  EVP_PKEY *const key = certificate.GetNativeKey();
  const char *const name = key ? EVP_PKEY_get0_type_name(key) : nullptr;
  return name ? name + (", " + std::to_string(certificate.GetKey().GetBits())) + " bits" : "unknown";
}

} // namespace

CertificateFacts ReadCertificateFacts(const Certificate &certificate) {
  const CertificateImpl &native = AsImpl(certificate);
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  CertificateFacts facts;
  facts.key = DescribeKey(native);
  facts.keyRefusal = RefuseKey(certificate);
  if (!AddAlternativeNames(native.GetNative(), facts)) {
    AddCommonNames(native.GetNative(), facts);
  }
  errors.RequireMemory();
  return facts;
}

} // namespace Tarvel::Crypto
