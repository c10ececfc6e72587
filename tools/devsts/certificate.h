// SPDX-License-Identifier: Apache-2.0
/// @file
/// X.509 certificates and their keys, in OpenSSL's types.

#pragma once

#include <openssl/evp.h>
#include <openssl/x509.h>

#include <memory>
#include <string>
#include <string_view>

namespace DevSts {

struct X509Deleter {
  void operator()(X509 *certificate) const noexcept { X509_free(certificate); }
};
struct KeyDeleter {
  void operator()(EVP_PKEY *key) const noexcept { EVP_PKEY_free(key); }
};
using Certificate = std::unique_ptr<X509, X509Deleter>;
using PrivateKey = std::unique_ptr<EVP_PKEY, KeyDeleter>;

/// Decodes a certificate from Base64 of its DER form; white space is allowed. Null when the text is not a certificate.
Certificate DecodeCertificate(std::string_view base64);

/// Base64 of the DER form, without line breaks.
std::string EncodeCertificate(const X509 &certificate);

/// The SHA-256 digest of the DER form, as 64 lower-case hexadecimal digits.
std::string ThumbprintOf(const X509 &certificate);

/// The SHA-256 digest of the public key (its SubjectPublicKeyInfo), as 64 lower-case hexadecimal digits.
std::string KeyThumbprintOf(const X509 &certificate);

/// Whether the key is RSA of at least 2048 bits.
bool HasStrongKey(const X509 &certificate);

/// Whether `authority` issued the certificate, its extended key usage is for clients, and its dates are valid now.
bool IsClientOf(X509 &certificate, X509 &authority);

/// "CN@O" of the subject; empty unless it has exactly one of each.
std::string PrincipalOf(const X509 &certificate);

/// Returns the texts of OpenSSL's error queue, and empties it.
std::string OpenSslErrors();

} // namespace DevSts
