// SPDX-License-Identifier: Apache-2.0

#include "gss/gss_negotiation_context_impl.h"

#include <ssoclient/create_saml_token.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <utility>

namespace SsoClient::InternalApi {

GssNegotiationContextImpl::GssNegotiationContextImpl(const TokenSpec &spec,
                                                     std::shared_ptr<const RequestBuilder> requestBuilder,
                                                     std::shared_ptr<TransportSession> session,
                                                     std::shared_ptr<const ResponseHandler> responseHandler,
                                                     const Tarvel::Crypto::CertificateList &signingCertificates)
    : m_spec(spec), m_requestBuilder(std::move(requestBuilder)), m_session(std::move(session)),
      m_responseHandler(std::move(responseHandler)), m_signingCertificates(signingCertificates) {
  if (m_signingCertificates.empty()) {
    throw Tarvel::InvalidArgumentException("No STS trusted certificates provided");
  }
}

GssNegotiationResult GssNegotiationContextImpl::NegotiateToken(const std::vector<std::uint8_t> &leg) {
  const SPNegoResponse response = Exchange(leg);
  m_contextId = response.contextId;
  GssNegotiationResult result;
  result.serverLeg = std::make_shared<std::vector<std::uint8_t>>(response.leg);
  if (!response.tokenXml.empty()) {
    result.token = CreateSamlToken(response.tokenXml, m_signingCertificates);
  }
  return result;
}

SPNegoResponse GssNegotiationContextImpl::Exchange(const std::vector<std::uint8_t> &leg) const {
  Request request;
  if (m_contextId.empty()) {
    m_requestBuilder->BuildInitialSPNegoRequest(m_spec, leg, request);
  } else {
    m_requestBuilder->BuildContinuedSPNegoRequest(m_contextId, leg, request);
  }
  Tarvel::Ref<Tarvel::Reader> body;
  m_session->SendRequest(request, body);
  SPNegoResponse response;
  m_responseHandler->HandleSPNegoResponse(body.get(), response);
  return response;
}

} // namespace SsoClient::InternalApi
