// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssNegotiationContextImpl`, the implementation of `GssNegotiationContext`.

#pragma once

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "transport/transport.h"

#include <ssoclient/gss_negotiation_context.h>
#include <tarvel/crypto/certificate.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient::InternalApi {

/// The first leg starts a negotiation. Each later leg continues it, as long as the service returns a context identifier.
class GssNegotiationContextImpl final : public virtual GssNegotiationContext {
public:
  /// @throws Tarvel::InvalidArgumentException when there is no certificate, because no token could be accepted then.
  GssNegotiationContextImpl(const TokenSpec &spec, std::shared_ptr<const RequestBuilder> requestBuilder,
                            std::shared_ptr<TransportSession> session,
                            std::shared_ptr<const ResponseHandler> responseHandler,
                            const Tarvel::Crypto::CertificateList &signingCertificates);

  GssNegotiationResult NegotiateToken(const std::vector<std::uint8_t> &leg) override;

private:
  SPNegoResponse Exchange(const std::vector<std::uint8_t> &leg) const;

  TokenSpec m_spec;
  std::string m_contextId; // empty before the first leg, then the last one that the service returned
  std::shared_ptr<const RequestBuilder> m_requestBuilder;
  std::shared_ptr<TransportSession> m_session;
  std::shared_ptr<const ResponseHandler> m_responseHandler;
  Tarvel::Crypto::CertificateList m_signingCertificates;
};

} // namespace SsoClient::InternalApi
