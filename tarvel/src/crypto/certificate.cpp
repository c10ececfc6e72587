// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/certificate.h>

#include "crypto/certificate_impl.h"
#include "crypto/key_file.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/openssl_handles.h"
#include "crypto/pem_reader.h"
#include "crypto/recent_certificates.h"

namespace Tarvel::Crypto {

namespace {

constexpr const char *NO_CERTIFICATE = "There is no certificate in the text";

Ref<const Certificate> DecodeBlock(PemBlock &block) {
  return CreateCertificateFromDer(block.GetData(), static_cast<std::size_t>(block.GetLength()));
}

[[noreturn]] void RefusePrivateKey(std::string_view form) {
  throw CryptoException("Holds a private key (" + std::string(form) + ") where only certificates belong");
}

bool IsPrivateKeyInDer(std::string_view bytes) {
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  const auto *position = reinterpret_cast<const unsigned char *>(bytes.data());
  const long length = static_cast<long>(bytes.size());
  const KeyHandle key(d2i_AutoPrivateKey_ex(nullptr, &position, length, GetLibraryContext(), nullptr));
  if (!key) {
    errors.RequireMemory();
  }
  return key != nullptr;
}

Ref<const Certificate> DecodeDerFile(std::string_view bytes) {
  try {
    return CreateCertificateFromDer(reinterpret_cast<const std::uint8_t *>(bytes.data()), bytes.size());
  } catch (const CryptoException &) {
    if (IsPrivateKeyInDer(bytes)) {
      RefusePrivateKey("DER");
    }
    throw;
  }
}

} // namespace

TARVEL_DEFINE_EXCEPTION(CryptoException)

Certificate::~Certificate() = default;

Ref<const Certificate> CreateCertificateFromDer(const std::uint8_t *data, std::size_t length) {
  {
    const OpenSslGuard guard;
    guard.Require();
    if (Ref<const Certificate> recent = FindRecentCertificate(data, length)) {
      return recent;
    }
  }
  Ref<const Certificate> certificate = MakeRef<CertificateImpl>(data, length);
  KeepRecentCertificate(certificate);
  return certificate;
}

Ref<const Certificate> CreateCertificateFromPem(std::string_view pem) {
  PemReader reader(pem);
  PemBlock block;
  while (reader.Next(block)) {
    if (block.IsCertificate()) {
      return DecodeBlock(block);
    }
  }
  throw CryptoException(NO_CERTIFICATE);
}

CertificateList CreateCertificatesFromPem(std::string_view pem) {
  CertificateList certificates;
  PemReader reader(pem);
  PemBlock block;
  while (reader.Next(block)) {
    if (block.IsPrivateKey()) {
      RefusePrivateKey(block.GetLabel());
    }
    if (block.IsCertificate()) {
      certificates.push_back(DecodeBlock(block));
    }
  }
  if (certificates.empty()) {
    throw CryptoException(NO_CERTIFICATE);
  }
  return certificates;
}

CertificateList LoadCertificates(const std::string &path) {
  constexpr char DER_SEQUENCE = 0x30;
  const SecretText file = ReadKeyFile(path);
  const std::string_view text = file.Get();
  return WithPathInErrors(path, [text]() -> CertificateList {
    if (text.starts_with(DER_SEQUENCE) && !PemReader::LooksLikePem(text)) {
      return {DecodeDerFile(text)};
    }
    return CreateCertificatesFromPem(text);
  });
}

} // namespace Tarvel::Crypto
