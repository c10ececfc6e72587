// SPDX-License-Identifier: Apache-2.0

#include "service/security_token_service_impl.h"

#include "operation/operation_frame.h"

#include <utility>

namespace SsoClient {

using Tarvel::Ref;

SecurityTokenServiceImpl::SecurityTokenServiceImpl(std::shared_ptr<const RequestBuilder> requestBuilder,
                                                   std::shared_ptr<const Transport> transport,
                                                   std::shared_ptr<const ResponseHandler> responseHandler,
                                                   const Tarvel::Crypto::CertificateList &signingCertificates,
                                                   const ServiceOptions &options)
    : m_requestBuilder(std::move(requestBuilder)), m_transport(std::move(transport)),
      m_steps(m_requestBuilder, std::move(responseHandler),
              std::make_shared<const ReturnedTokens>(signingCertificates, options)),
      m_observer(options.observer) {}

template <typename Operation>
auto SecurityTokenServiceImpl::Run(const char *name, const Operation &operation) const {
  const OperationFrame frame(name);
  OperationEvents events(m_observer.get(), name, frame.GetId());
  return events.Run([&] { return operation(events); });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireToken(const std::string &username,
                                                                        const std::string &password,
                                                                        const TokenSpec &spec) const {
  return Run("AcquireToken", [&](OperationEvents &events) {
    Request request;
    m_steps.ComposeByPassword(username, password, spec, request, events);
    LogOperation("SecurityTokenServiceImpl::AcquireToken sending request");
    const Ref<Tarvel::Reader> response = Send(std::move(request), events);
    LogOperation("SecurityTokenServiceImpl::AcquireToken processing response");
    return m_steps.ReadIssued(*response, events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByGSS(const TokenSpec &spec,
                                                                             NegotiationHandler &handler) const {
  return Run("AcquireTokenByGSS", [&](OperationEvents &events) {
    TokenSteps::LogNegotiation(spec);
    SPNegoResponse spnego;
    Negotiate(spec, handler, spnego, events);
    return m_steps.ToSamlToken(spnego.tokenXml, events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByCertificate(const TokenSpec &spec) const {
  return Run("AcquireTokenByCertificate", [&](OperationEvents &events) {
    Request request;
    m_steps.ComposeByCertificate(spec, request);
    return m_steps.ReadIssued(*Send(std::move(request), events), events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByToken(const SamlToken &token,
                                                                               const TokenSpec &spec) const {
  return Run("AcquireTokenByToken", [&](OperationEvents &events) {
    Request request;
    m_steps.ComposeByToken(token, spec, request, events);
    return m_steps.ReadIssued(*Send(std::move(request), events), events);
  });
}

bool SecurityTokenServiceImpl::ValidateSubject(const SamlToken &token) const {
  return Run("ValidateSubject", [&](OperationEvents &events) {
    Request request;
    m_steps.ComposeValidation(token, request, events);
    return m_steps.ReadValidity(*Send(std::move(request), events), events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RenewToken(const SamlToken &token,
                                                                      std::int64_t lifetimeSec) const {
  return Run("RenewToken", [&](OperationEvents &events) {
    Request request;
    m_steps.ComposeRenewal(token, lifetimeSec, request, events);
    return m_steps.ReadRenewed(*Send(std::move(request), events), events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(const std::string &xml) const {
  OperationEvents unobserved;
  return m_steps.ToSamlToken(xml, unobserved);
}

void SecurityTokenServiceImpl::StartSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                                                  const TokenSpec &spec, SPNegoResponse &spnego) const {
  OperationEvents unobserved;
  StartSPNegotiation(session, leg, spec, spnego, unobserved);
}

void SecurityTokenServiceImpl::StartSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                                                  const TokenSpec &spec, SPNegoResponse &spnego,
                                                  OperationEvents &events) const {
  Request request;
  m_requestBuilder->BuildInitialSPNegoRequest(spec, leg, request);
  SendLeg(session, request, spnego, events);
}

void SecurityTokenServiceImpl::ContinueSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                                                     const std::string &contextId, SPNegoResponse &spnego) const {
  OperationEvents unobserved;
  ContinueSPNegotiation(session, leg, contextId, spnego, unobserved);
}

void SecurityTokenServiceImpl::ContinueSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                                                     const std::string &contextId, SPNegoResponse &spnego,
                                                     OperationEvents &events) const {
  Request request;
  m_requestBuilder->BuildContinuedSPNegoRequest(contextId, leg, request);
  SendLeg(session, request, spnego, events);
}

Ref<Tarvel::Reader> SecurityTokenServiceImpl::Send(Request &&request, OperationEvents &events) const {
  Request own = std::move(request); // wiped on return
  return events.Send(*m_transport->CreateSession(), own);
}

void SecurityTokenServiceImpl::SendLeg(TransportSession &session, Request &request, SPNegoResponse &spnego,
                                       OperationEvents &events) const {
  const Ref<Tarvel::Reader> response = events.Send(session, request);
  m_steps.ReadLeg(*response, spnego, events);
}

void SecurityTokenServiceImpl::Negotiate(const TokenSpec &spec, NegotiationHandler &handler, SPNegoResponse &spnego,
                                         OperationEvents &events) const {
  const std::shared_ptr<TransportSession> session = m_transport->CreateSession();
  for (int number = 1; spnego.tokenXml.empty(); ++number) {
    const std::shared_ptr<std::vector<std::uint8_t>> leg = TokenSteps::AskForLeg(handler, spnego.leg, number, events);
    if (spnego.contextId.empty()) {
      StartSPNegotiation(*session, *leg, spec, spnego, events);
    } else {
      ContinueSPNegotiation(*session, *leg, spnego.contextId, spnego, events);
    }
    TokenSteps::CheckLeg(spnego, events);
  }
  TokenSteps::HandOverFinalLeg(handler, spnego.leg);
}

} // namespace SsoClient
