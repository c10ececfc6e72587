// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/private_key.h>

#include "crypto/key_file.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_handles.h"
#include "crypto/passphrase.h"
#include "crypto/private_key_impl.h"

#include <utility>

namespace Tarvel::Crypto {

namespace {

struct NativeKeyStore {
  KeyHandle key;
  CertificateHandle certificate;
  CertificateStackHandle others;
};

Pkcs12Handle Decode(std::string_view der) {
  const OpenSslErrorScope errors;
  const auto *const begin = reinterpret_cast<const unsigned char *>(der.data());
  const unsigned char *position = begin;
  // The store keeps the library context for later calls.
  PKCS12 *blank = PKCS12_init_ex(NID_pkcs7_data, GetLibraryContext(), nullptr);
  if (!blank) {
    throw OutOfMemoryException();
  }
  Pkcs12Handle store(d2i_PKCS12(&blank, &position, static_cast<long>(der.size()))); // frees `blank` on failure
  if (!store) {
    errors.Throw("The PKCS#12 key store does not decode");
  }
  if (position != begin + der.size()) {
    throw CryptoException("The PKCS#12 key store is followed by further bytes");
  }
  return store;
}

// There are two encodings of an empty passphrase, null and the empty text. Neither needs the callback.
bool OpensWithoutPassphrase(PKCS12 *store) {
  const OpenSslErrorScope errors;
  const bool opens = PKCS12_verify_mac(store, nullptr, 0) == 1 || PKCS12_verify_mac(store, "", 0) == 1;
  if (!opens) {
    errors.RequireMemory();
  }
  return opens;
}

// The passphrase that opens the store; empty when none is needed.
const std::string &FindPassphrase(PKCS12 *store, Passphrase &passphrase) {
  static const std::string NONE;
  if (PKCS12_mac_present(store) == 0) {
    throw CryptoException("The PKCS#12 key store has no integrity check by passphrase");
  }
  if (OpensWithoutPassphrase(store)) {
    return NONE;
  }
  const std::string &secret = passphrase.Get();
  const OpenSslErrorScope errors;
  if (PKCS12_verify_mac(store, secret.c_str(), -1) != 1) {
    throw WrongPassphraseException(errors.Describe("The passphrase of the PKCS#12 key store is wrong"));
  }
  return secret;
}

NativeKeyStore Open(PKCS12 *store, const std::string &passphrase) {
  const OpenSslErrorScope errors;
  const LibraryContextScope context;
  EVP_PKEY *key = nullptr;
  X509 *certificate = nullptr;
  STACK_OF(X509) *others = nullptr;
  const int opened = PKCS12_parse(store, passphrase.c_str(), &key, &certificate, &others);
  NativeKeyStore native{KeyHandle(key), CertificateHandle(certificate), CertificateStackHandle(others)};
  if (opened != 1) {
    errors.Throw("The PKCS#12 key store cannot be read");
  }
  errors.RequireMemory(); // without memory, OpenSSL leaves out certificates and reports success
  return native;
}

Ref<const Certificate> ToCertificate(X509 *native) {
  const OpenSslErrorScope errors;
  unsigned char *der = nullptr;
  const int length = i2d_X509(native, &der);
  const MemoryHandle owner(der);
  if (length <= 0) {
    errors.Throw("A certificate of the PKCS#12 key store does not encode");
  }
  return CreateCertificateFromDer(der, static_cast<std::size_t>(length));
}

} // namespace

KeyStore CreateKeyStoreFromPkcs12(std::string_view der, const PassphraseCallback &passphrase) {
  OpenSslGuard::Prepare();
  OpenSslGuard guard;
  guard.Require();
  const Pkcs12Handle store = Decode(der);
  Passphrase secret(passphrase, guard, nullptr);
  NativeKeyStore native = Open(store.get(), FindPassphrase(store.get(), secret));
  if (!native.key) {
    throw NoKeyException("There is no private key in the PKCS#12 key store");
  }
  if (!native.certificate) {
    throw CryptoException("There is no certificate for the private key in the PKCS#12 key store");
  }
  KeyStore result{MakeRef<PrivateKeyImpl>(std::move(native.key)), ToCertificate(native.certificate.get()), {}};
  for (int i = 0; i < sk_X509_num(native.others.get()); ++i) {
    result.others.push_back(ToCertificate(sk_X509_value(native.others.get(), i)));
  }
  return result;
}

KeyStore LoadKeyStore(const std::string &path, const PassphraseCallback &passphrase) {
  const SecretText file = ReadKeyFile(path);
  return WithPathInErrors(path, [&] { return CreateKeyStoreFromPkcs12(file.Get(), passphrase); });
}

} // namespace Tarvel::Crypto
