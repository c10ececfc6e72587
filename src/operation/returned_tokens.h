// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReturnedTokens`, which verifies the tokens that a service returns.

#pragma once

#include "operation/operation_events.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/service_options.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/certificate.h>

#include <memory>
#include <string>

namespace SsoClient {

/// Verifies with the options of the service, and passes each refused token to the sink. Immutable, so any number of
/// threads may use it.
class ReturnedTokens {
public:
  /// @param trustedCertificates the certificates with which the service signs
  ReturnedTokens(const Tarvel::Crypto::CertificateList &trustedCertificates, const ServiceOptions &options);

  /// The verified token in `xml`.
  /// @throws what `TokenVerifier::Verify` throws.
  std::shared_ptr<const SamlToken> Verify(const std::string &xml, OperationEvents &events) const;

private:
  void HandOver(const std::string &xml, OperationEvents &events) const noexcept;

  TokenVerifier m_verifier;
  ServiceOptions::RefusedTokenSink m_sink;
};

} // namespace SsoClient
