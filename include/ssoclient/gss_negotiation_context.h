// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssNegotiationContext`, for callers that run the GSS (SPNEGO) loop themselves.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <memory>
#include <vector>

namespace SsoClient::InternalApi {

/// The service's answer to one leg.
struct GssNegotiationResult {
  /// The service's GSS output token, for the caller alone; empty when the service sent none. Never null.
  std::shared_ptr<std::vector<std::uint8_t>> serverLeg;
  /// The issued token; null while the negotiation goes on.
  std::shared_ptr<const SamlToken> token;
};

/// One negotiation over one session. For one caller at a time; always held by the shared pointer that
/// `CreateGssNegotiationContext` made. It cannot be used for a second negotiation.
class SSOCLIENT_API GssNegotiationContext {
public:
  /// Sends the client's leg and waits, up to 40 seconds, for the service's answer.
  /// @param leg the caller's GSS output token; may be empty.
  /// @throws what the operations of `SecurityTokenService` throw, but ParseException for a token that is malformed,
  ///         expired or not valid yet. After an exception the negotiation stands where the last answered leg left it.
  virtual GssNegotiationResult NegotiateToken(const std::vector<std::uint8_t> &leg) = 0;

protected:
  GssNegotiationContext() = default;
  GssNegotiationContext(const GssNegotiationContext &) = default;
  GssNegotiationContext &operator=(const GssNegotiationContext &) = default;
  ~GssNegotiationContext() = default;
};

/// A negotiation for a token as `spec` asks for, with the service that `config` describes. Nothing is connected or sent
/// yet. Both are copied from; the configuration's SSL context must outlive the result. `useDomainControllerName` does not
/// count here.
/// @throws Tarvel::InvalidArgumentException without signing certificates, for an HTTPS address without an SSL context, and
///         for an identity without key or certificate.
/// @throws Tarvel::Http::MalformedURLException for a malformed address.
SSOCLIENT_API std::shared_ptr<GssNegotiationContext>
CreateGssNegotiationContext(const SecurityTokenServiceConfig &config, const TokenSpec &spec);

} // namespace SsoClient::InternalApi
