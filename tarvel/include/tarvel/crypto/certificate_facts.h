// SPDX-License-Identifier: Apache-2.0
/// @file
/// What people ask about a certificate when it does not work: its key, and the names that it is for.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/crypto/certificate.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Tarvel::Crypto {

/// How many names `ReadCertificateFacts` returns at most.
constexpr std::size_t MAX_CERTIFICATE_NAMES = 100;

/// Facts about a certificate, for people to read. Nothing here decides whether the certificate is accepted.
struct CertificateFacts {
  std::string key; ///< kind and size of the public key, such as "RSA, 2048 bits"; "unknown" if OpenSSL does not know it

  /// Why no signature by this key over a token is accepted; empty if there is no such reason. The verification of
  /// signatures uses the same rule.
  std::string keyRefusal;

  /// The host names and addresses that the certificate is for (RFC 5280, subject alternative names of the kinds DNS and
  /// IP); if none of them is a host name, also the common names of the subject. Order and texts are those of the
  /// certificate: they are not verified, and may contain any character.
  std::vector<std::string> names;
  std::size_t nameCount = 0; ///< how many names there are, including those beyond the limit
};

/// The facts about `certificate`. Safe on any thread.
/// @throws TypeMismatchException for a certificate that this library has not made. @throws InvalidStateException,
///         OutOfMemoryException as in `CryptoException`.
TARVEL_API CertificateFacts ReadCertificateFacts(const Certificate &certificate);

} // namespace Tarvel::Crypto
