// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/private_key.h>

#include "crypto/certificate_impl.h"
#include "crypto/key_file.h"
#include "crypto/key_uri.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_handles.h"
#include "crypto/passphrase.h"
#include "crypto/pem_reader.h"
#include "crypto/private_key_impl.h"

#include <tarvel/core/string_util.h>

#include <openssl/err.h>
#include <openssl/pem.h>

#include <algorithm>

namespace Tarvel::Crypto {

namespace {

constexpr const char *NO_KEY = "There is no private key in the text";
constexpr const char *KEY_DOES_NOT_DECODE = "The private key does not decode";
constexpr const char *WRONG_PASSPHRASE = "The passphrase of the private key is wrong";

const unsigned char *BytesOf(std::string_view der) {
  return reinterpret_cast<const unsigned char *>(der.data());
}

// OpenSSL's callback for a passphrase; `secret` is a `const std::string`. A text longer than `size` is wrong in any case.
int GivePassphrase(char *buffer, int size, int, void *secret) {
  const std::string &text = *static_cast<const std::string *>(secret);
  if (text.size() > static_cast<std::size_t>(size)) {
    return -1;
  }
  std::copy(text.begin(), text.end(), buffer);
  return static_cast<int>(text.size());
}

// PKCS#8 or one of the traditional forms, not encrypted. Null if it does not decode or bytes follow it; the caller's
// error scope has the reason.
KeyHandle DecodePlain(std::string_view der) {
  const unsigned char *position = BytesOf(der);
  KeyHandle key(d2i_AutoPrivateKey_ex(nullptr, &position, static_cast<long>(der.size()), GetLibraryContext(), nullptr));
  return key && position == BytesOf(der) + der.size() ? std::move(key) : nullptr;
}

EncryptedKeyHandle DecodeEncrypted(std::string_view der) {
  const OpenSslErrorScope errors;
  const unsigned char *position = BytesOf(der);
  EncryptedKeyHandle encrypted(d2i_X509_SIG(nullptr, &position, static_cast<long>(der.size())));
  if (!encrypted) {
    errors.RequireMemory();
  }
  return encrypted && position == BytesOf(der) + der.size() ? std::move(encrypted) : nullptr;
}

// A wrong passphrase leads to wrong padding or, one time in 256, to a key that does not decode.
KeyHandle Decrypt(const X509_SIG *encrypted, Passphrase &passphrase) {
  const std::string &secret = passphrase.Get();
  const OpenSslErrorScope errors;
  const PlainKeyHandle plain(
      PKCS8_decrypt_ex(encrypted, secret.data(), static_cast<int>(secret.size()), GetLibraryContext(), nullptr));
  if (!plain && ERR_GET_REASON(errors.PeekNewest()) == ERR_R_UNSUPPORTED) {
    errors.Throw("The private key cannot be decrypted");
  }
  if (!plain) {
    throw WrongPassphraseException(errors.Describe(WRONG_PASSPHRASE));
  }
  KeyHandle key(EVP_PKCS82PKEY_ex(plain.get(), GetLibraryContext(), nullptr));
  if (!key) {
    errors.Throw(KEY_DOES_NOT_DECODE);
  }
  return key;
}

KeyHandle DecodeEncryptedOrThrow(std::string_view der, Passphrase &passphrase) {
  const EncryptedKeyHandle encrypted = DecodeEncrypted(der);
  if (!encrypted) {
    throw CryptoException("The encrypted private key does not decode");
  }
  return Decrypt(encrypted.get(), passphrase);
}

// The traditional form has its cipher in headers (RFC 1421), and is decrypted in place. Returns whether it was
// encrypted.
bool DecryptInPlace(PemBlock &block, Passphrase &passphrase) {
  const OpenSslErrorScope errors;
  EVP_CIPHER_INFO cipher{};
  if (PEM_get_EVP_CIPHER_INFO(block.GetHeaders(), &cipher) != 1) {
    errors.Throw("The headers of the private key do not decode");
  }
  if (!cipher.cipher) {
    return false;
  }
  const std::string &secret = passphrase.Get();
  long length = block.GetLength();
  const LibraryContextScope context;
  if (PEM_do_header(&cipher, block.GetData(), &length, GivePassphrase, const_cast<std::string *>(&secret)) != 1) {
    throw WrongPassphraseException(errors.Describe(WRONG_PASSPHRASE));
  }
  block.SetLength(length);
  return true;
}

KeyHandle DecodeBlock(PemBlock &block, Passphrase &passphrase) {
  const bool wasEncrypted = DecryptInPlace(block, passphrase);
  const std::string_view der(reinterpret_cast<const char *>(block.GetData()),
                             static_cast<std::size_t>(block.GetLength()));
  if (block.GetLabel() == "ENCRYPTED PRIVATE KEY") {
    return DecodeEncryptedOrThrow(der, passphrase);
  }
  const OpenSslErrorScope errors;
  KeyHandle key = DecodePlain(der);
  if (!key && wasEncrypted) {
    throw WrongPassphraseException(errors.Describe(WRONG_PASSPHRASE));
  }
  if (!key) {
    errors.Throw(KEY_DOES_NOT_DECODE);
  }
  return key;
}

KeyHandle DecodePem(std::string_view text, Passphrase &passphrase) {
  PemReader reader(text);
  PemBlock block;
  while (reader.Next(block)) {
    if (block.IsPrivateKey()) {
      return DecodeBlock(block, passphrase);
    }
  }
  throw NoKeyException(NO_KEY);
}

bool IsCertificateInDer(std::string_view der) {
  const OpenSslErrorScope errors;
  const unsigned char *position = BytesOf(der);
  const CertificateHandle certificate(d2i_X509(nullptr, &position, static_cast<long>(der.size())));
  if (!certificate) {
    errors.RequireMemory();
  }
  return certificate != nullptr;
}

KeyHandle DecodeDer(std::string_view der, Passphrase &passphrase) {
  if (const EncryptedKeyHandle encrypted = DecodeEncrypted(der)) {
    return Decrypt(encrypted.get(), passphrase);
  }
  const OpenSslErrorScope errors;
  KeyHandle key = DecodePlain(der);
  if (key) {
    return key;
  }
  errors.RequireMemory();
  if (IsCertificateInDer(der)) {
    throw NoKeyException("There is a certificate, and no private key");
  }
  errors.Throw(KEY_DOES_NOT_DECODE);
}

} // namespace

TARVEL_DEFINE_EXCEPTION(WrongPassphraseException)
TARVEL_DEFINE_EXCEPTION(NoKeyException)
TARVEL_DEFINE_EXCEPTION(KeyMismatchException)

PrivateKey::~PrivateKey() = default;

Ref<const PrivateKey> CreatePrivateKey(std::string_view text, const PassphraseCallback &passphrase) {
  constexpr char DER_SEQUENCE = 0x30;
  OpenSslGuard::Prepare();
  OpenSslGuard guard;
  guard.Require();
  ProviderTurn turn(UsesSystemConfiguration());
  Passphrase secret(passphrase, guard, &turn);
  if (PemReader::LooksLikePem(text)) {
    return MakeRef<PrivateKeyImpl>(DecodePem(text, secret));
  }
  if (!text.starts_with(DER_SEQUENCE)) {
    throw NoKeyException(NO_KEY);
  }
  return MakeRef<PrivateKeyImpl>(DecodeDer(text, secret));
}

Ref<const PrivateKey> LoadPrivateKey(const std::string &pathOrUri, const PassphraseCallback &passphrase) {
  if (IsKeyUri(pathOrUri)) {
    return WithPathInErrors(pathOrUri, [&] { return LoadPrivateKeyFromUri(pathOrUri, passphrase); });
  }
  const SecretText file = ReadKeyFile(pathOrUri);
  return WithPathInErrors(pathOrUri, [&] { return CreatePrivateKey(file.Get(), passphrase); });
}

void RequireKeyMatchesCertificate(const PrivateKey &key, const Certificate &certificate) {
  const PrivateKeyImpl &privateKey = AsImpl(key);
  EVP_PKEY *const publicKey = AsImpl(certificate).GetNativeKey();
  const ProviderTurn turn(privateKey.IsInAddedProvider());
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  if (!publicKey || EVP_PKEY_eq(publicKey, privateKey.GetNative()) != 1) {
    errors.RequireMemory();
    throw KeyMismatchException("The private key does not belong to the certificate " +
                               StringUtil::Shorten(certificate.GetSubject()));
  }
}

} // namespace Tarvel::Crypto
