// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssNegotiationContext`, for callers that run the GSS (SPNEGO) loop themselves.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/service_options.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <memory>
#include <vector>

namespace SsoClient::InternalApi {

/// The service's response to one leg.
struct GssNegotiationResult {
  /// The service's GSS output token; empty when the service sent none. Never null. The library keeps no reference to
  /// it.
  std::shared_ptr<std::vector<std::uint8_t>> serverLeg;
  /// The issued token; null until the negotiation is complete.
  std::shared_ptr<const SamlToken> token;
};

/// One negotiation in one session. It cannot be used for a second negotiation. One thread at a time may use it. It is
/// always owned by the shared pointer that `CreateGssNegotiationContext` returned.
class SSOCLIENT_API GssNegotiationContext {
public:
  /// Sends the client's leg and waits up to 40 seconds for the service's response.
  /// @param leg the caller's GSS output token; may be empty
  /// @throws what the operations of `SecurityTokenService` throw, with one difference: ParseException, not
  ///         SsoException, for a token that is malformed, expired or not valid yet. After an exception, the negotiation
  ///         is in the state that it had after the last leg that was answered.
  virtual GssNegotiationResult NegotiateToken(const std::vector<std::uint8_t> &leg) = 0;

protected:
  GssNegotiationContext() = default;
  GssNegotiationContext(const GssNegotiationContext &) = default;
  GssNegotiationContext &operator=(const GssNegotiationContext &) = default;
  ~GssNegotiationContext() = default;
};

/// A negotiation for a token with the properties of `spec`, with the service that `config` describes. Nothing is connected or
/// sent yet. Both are copied; the result takes its own reference to the SSL context. `useDomainControllerName` is ignored.
/// @throws Tarvel::InvalidArgumentException when there are no signing certificates, for an HTTPS address without an SSL
///         context, and for an identity without key or certificate.
/// @throws Tarvel::Http::MalformedURLException for a malformed address.
SSOCLIENT_API std::shared_ptr<GssNegotiationContext>
CreateGssNegotiationContext(const SecurityTokenServiceConfig &config, const TokenSpec &spec);

/// The same with options, which are copied. Each call of `NegotiateToken` is one operation for the observer.
/// @throws Tarvel::InvalidArgumentException also when `CheckServiceDialect` refuses the dialect, or when
///         `TokenVerifier` refuses the `verifyOptions`.
SSOCLIENT_API std::shared_ptr<GssNegotiationContext>
CreateGssNegotiationContext(const SecurityTokenServiceConfig &config, const TokenSpec &spec,
                            const ServiceOptions &options);

} // namespace SsoClient::InternalApi
