// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecurityTokenServiceConfig`, how to reach a token service and which keys to trust.

#pragma once

#include <ssoclient/holder_of_key_config.h>
#include <tarvel/crypto/certificate.h>

#include <boost/optional.hpp>

#include <string>

namespace Tarvel::Ssl {
class SSLContext;
} // namespace Tarvel::Ssl

namespace SsoClient {

/// What is needed to create the client of a token service. It may be changed or destroyed after the call to which it
/// was passed has returned: the call copies all fields, and takes its own reference to the SSL context.
struct SecurityTokenServiceConfig {
  /// The address of the service. Its scheme is https or http.
  std::string stsUrl;
  /// The service's signing certificates. The signature of every token must verify with the key of one of them.
  Tarvel::Crypto::CertificateList signingCertificates;
  /// When not empty, the expected SHA-256 thumbprint of the server's certificate. It is passed to the TLS handshake unchanged;
  /// see `Tarvel::Ssl::SSLStream`.
  std::string sslParameter;
  /// The identity that signs requests and to which holder-of-key tokens are bound. Without it, requests are not signed and
  /// tokens are bearer tokens.
  boost::optional<HolderOfKeyConfig> holderOfKeyConfig;
  /// The context for HTTPS connections, required when `stsUrl` is an HTTPS URL. This record does not own it: the
  /// context must exist when a service or a negotiation context is created from this record. The service or negotiation
  /// context takes its own reference and keeps it as long as it exists. The caller may then release its `Tarvel::Ref`,
  /// or keep it longer.
  Tarvel::Ssl::SSLContext *sslContext = nullptr;
  /// Whether to connect to the domain controller that `GetOstrelDCName` returns, if it returns one, instead of the host
  /// of `stsUrl`. A `GssNegotiationContext` ignores this field.
  bool useDomainControllerName = false;
};

} // namespace SsoClient
