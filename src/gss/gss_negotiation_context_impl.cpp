// SPDX-License-Identifier: Apache-2.0

#include "gss/gss_negotiation_context_impl.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <new>
#include <utility>

namespace SsoClient::InternalApi {

GssNegotiationContextImpl::GssNegotiationContextImpl(const TokenSpec &spec,
                                                     std::shared_ptr<const RequestBuilder> requestBuilder,
                                                     std::shared_ptr<TransportSession> session,
                                                     std::shared_ptr<const ResponseHandler> responseHandler,
                                                     const Tarvel::Crypto::CertificateList &signingCertificates,
                                                     const ServiceOptions &options)
    : m_spec(spec), m_requestBuilder(std::move(requestBuilder)), m_session(std::move(session)),
      m_responseHandler(std::move(responseHandler)), m_returnedTokens(signingCertificates, options),
      m_observer(options.observer) {
  if (signingCertificates.empty()) {
    throw Tarvel::InvalidArgumentException("No STS trusted certificates provided");
  }
}

GssNegotiationResult GssNegotiationContextImpl::NegotiateToken(const std::vector<std::uint8_t> &leg) {
  const std::string newId;
  OperationEvents events(m_isObserved ? m_observer.get() : nullptr, "NegotiateToken", newId);
  return events.Run([&] { return Negotiate(leg, events); });
}

GssNegotiationResult GssNegotiationContextImpl::Negotiate(const std::vector<std::uint8_t> &leg,
                                                          OperationEvents &events) {
  events.SetLeg(m_answeredLegs + 1);
  for (const std::vector<std::uint8_t> &earlier : m_earlierLegs) {
    events.HideLeg(earlier);
  }
  HideLeg(leg, events);
  const SPNegoResponse response = Exchange(leg, events);
  HideLeg(response.leg, events);
  ++m_answeredLegs;
  m_contextId = response.contextId;
  GssNegotiationResult result;
  result.serverLeg = std::make_shared<std::vector<std::uint8_t>>(response.leg);
  if (!response.tokenXml.empty()) {
    result.token = m_returnedTokens.Verify(response.tokenXml, events);
  }
  return result;
}

void GssNegotiationContextImpl::HideLeg(const std::vector<std::uint8_t> &leg, OperationEvents &events) noexcept {
  events.HideLeg(leg);
  if (!m_observer) {
    return;
  }
  try {
    m_earlierLegs.push_back(leg);
  } catch (const std::bad_alloc &) {
    m_isObserved = false; // later events could contain the leg
  }
}

SPNegoResponse GssNegotiationContextImpl::Exchange(const std::vector<std::uint8_t> &leg,
                                                   OperationEvents &events) const {
  Request request;
  if (m_contextId.empty()) {
    m_requestBuilder->BuildInitialSPNegoRequest(m_spec, leg, request);
  } else {
    m_requestBuilder->BuildContinuedSPNegoRequest(m_contextId, leg, request);
  }
  const Tarvel::Ref<Tarvel::Reader> body = events.Send(*m_session, request);
  SPNegoResponse response;
  events.Receive(*m_responseHandler,
                 [&](const ResponseHandler &handler) { handler.HandleSPNegoResponse(body.get(), response); });
  return response;
}

} // namespace SsoClient::InternalApi
