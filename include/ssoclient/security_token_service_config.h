// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecurityTokenServiceConfig`, how to reach a token service and whom to trust.

#pragma once

#include <ssoclient/holder_of_key_config.h>
#include <tarvel/crypto/certificate.h>

#include <boost/optional.hpp>

#include <string>

namespace Tarvel::Ssl {
class SSLContext;
} // namespace Tarvel::Ssl

namespace SsoClient {

/// Everything that is needed to create a token-service client. It is only read, and may be destroyed after the call
/// that it was given to; the SSL context is not copied.
struct SecurityTokenServiceConfig {
  /// The service's endpoint; its scheme decides between HTTPS and plain HTTP.
  std::string stsUrl;
  /// The service's signing certificates. Every token's signature must verify against one of them.
  Tarvel::Crypto::CertificateList signingCertificates;
  /// Given to the SSL handshake as it stands; when not empty, the expected SHA-256 thumbprint of the server's
  /// certificate.
  std::string sslParameter;
  /// Present when requests are to be signed and holder-of-key tokens may be requested.
  boost::optional<HolderOfKeyConfig> holderOfKeyConfig;
  /// The context for HTTPS connections, required when `stsUrl` is an HTTPS URL. Not owned: it must outlive every
  /// service that is created from this configuration.
  Tarvel::Ssl::SSLContext *sslContext = nullptr;
  /// Asks for the name of a domain controller to connect to in place of the host.
  bool useDomainControllerName = false;
};

} // namespace SsoClient
