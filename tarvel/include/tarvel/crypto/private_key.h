// SPDX-License-Identifier: Apache-2.0
/// @file
/// Private keys, and key stores that contain them with their certificates.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>

#include <functional>
#include <string>
#include <string_view>

namespace Tarvel::Crypto {

/// A passphrase that is missing or wrong.
class TARVEL_API WrongPassphraseException : public CryptoException {
  TARVEL_EXCEPTION_BODY(WrongPassphraseException, CryptoException);
};

/// A text, file or store without a private key.
class TARVEL_API NoKeyException : public CryptoException {
  TARVEL_EXCEPTION_BODY(NoKeyException, CryptoException);
};

/// A private key that does not belong to the certificate with which it is used.
class TARVEL_API KeyMismatchException : public CryptoException {
  TARVEL_EXCEPTION_BODY(KeyMismatchException, CryptoException);
};

/// An RSA or EC private key. Secret: it cannot be printed, and its memory is wiped when the last reference is released.
/// Immutable; safe on any thread.
class TARVEL_API PrivateKey : public Object {
public:
  /// "RSA" or "EC".
  virtual std::string GetAlgorithm() const = 0;
  /// Size of the modulus or of the curve's order, in bits.
  virtual unsigned GetBits() const = 0;

protected:
  ~PrivateKey() override;
};

/// Returns the passphrase of an encrypted key. A function below calls it on the caller's thread, at most once; it may
/// block. The text is wiped after use. An empty function means that there is no passphrase.
using PassphraseCallback = std::function<std::string()>;

/// The first private key in PEM text (PKCS#8, plain or encrypted, or the traditional forms) or in DER.
/// @throws NoKeyException when there is no private key. @throws WrongPassphraseException when it is encrypted and the
/// passphrase is missing or wrong. @throws CryptoException when it does not decode, or is neither RSA nor EC.
TARVEL_API Ref<const PrivateKey> CreatePrivateKey(std::string_view text, const PassphraseCallback &passphrase = {});

/// The private key in a file, or in the store that a URI refers to ("file:…"; after `UseSystemConfiguration` also the URIs
/// of the machine's providers, such as "pkcs11:…").
/// @throws IOException when a file cannot be read. Otherwise throws what `CreatePrivateKey` throws, with a message that
/// begins with the path.
TARVEL_API Ref<const PrivateKey> LoadPrivateKey(const std::string &pathOrUri,
                                                const PassphraseCallback &passphrase = {});

/// A private key, its certificate, and the other certificates of a key store.
struct KeyStore {
  Ref<const PrivateKey> privateKey;   ///< never null
  Ref<const Certificate> certificate; ///< of the key; never null
  CertificateList others;             ///< in the order of the store
};

/// Reads a key store in PKCS#12 form (RFC 7292).
/// @throws what `CreatePrivateKey` throws; `CryptoException` also when there is no certificate for the key.
TARVEL_API KeyStore CreateKeyStoreFromPkcs12(std::string_view der, const PassphraseCallback &passphrase);

/// Reads the PKCS#12 file at `path`.
/// @throws IOException when the file cannot be read. Otherwise throws what `CreateKeyStoreFromPkcs12` throws, with a message
/// that begins with the path.
TARVEL_API KeyStore LoadKeyStore(const std::string &path, const PassphraseCallback &passphrase);

/// @throws KeyMismatchException unless `key` is the private key of `certificate`.
TARVEL_API void RequireKeyMatchesCertificate(const PrivateKey &key, const Certificate &certificate);

} // namespace Tarvel::Crypto
