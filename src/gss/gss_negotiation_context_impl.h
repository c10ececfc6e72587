// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssNegotiationContextImpl`, the implementation of `GssNegotiationContext`.

#pragma once

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "operation/operation_events.h"
#include "operation/returned_tokens.h"
#include "transport/transport.h"

#include <ssoclient/gss_negotiation_context.h>
#include <ssoclient/service_options.h>
#include <tarvel/crypto/certificate.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient::InternalApi {

/// The first leg starts a negotiation. Each later leg continues it, as long as the service returns a context
/// identifier.
class GssNegotiationContextImpl final : public virtual GssNegotiationContext {
public:
  /// @throws Tarvel::InvalidArgumentException when there is no certificate, because no token could be accepted then.
  GssNegotiationContextImpl(const TokenSpec &spec, std::shared_ptr<const RequestBuilder> requestBuilder,
                            std::shared_ptr<TransportSession> session,
                            std::shared_ptr<const ResponseHandler> responseHandler,
                            const Tarvel::Crypto::CertificateList &signingCertificates,
                            const ServiceOptions &options = {});

  GssNegotiationResult NegotiateToken(const std::vector<std::uint8_t> &leg) override;

private:
  GssNegotiationResult Negotiate(const std::vector<std::uint8_t> &leg, OperationEvents &events);
  /// No event of this operation or a later one contains the leg.
  void HideLeg(const std::vector<std::uint8_t> &leg, OperationEvents &events) noexcept;
  SPNegoResponse Exchange(const std::vector<std::uint8_t> &leg, OperationEvents &events) const;

  TokenSpec m_spec;
  std::string m_contextId; // empty before the first leg, then the last one that the service returned
  std::shared_ptr<const RequestBuilder> m_requestBuilder;
  std::shared_ptr<TransportSession> m_session;
  std::shared_ptr<const ResponseHandler> m_responseHandler;
  const ReturnedTokens m_returnedTokens;
  std::shared_ptr<OperationObserver> m_observer;
  int m_answeredLegs = 0;
  bool m_isObserved = true;                             // false after there was no memory for a leg in m_earlierLegs
  std::vector<std::vector<std::uint8_t>> m_earlierLegs; // of both sides; empty without an observer
};

} // namespace SsoClient::InternalApi
