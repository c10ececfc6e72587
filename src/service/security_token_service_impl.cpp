// SPDX-License-Identifier: Apache-2.0

#include "service/security_token_service_impl.h"

#include "service/operation_frame.h"

#include <ssoclient/descriptions.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/logger.h>

#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Service::LogInternal;

/// Checked before a description is made: making one costs far more than the log call.
bool IsLoggingOperations() {
  return getLogger().GetLevel() >= LOG_LEVEL_OPERATION;
}

template <typename... Args>
void LogOperation(const char *message, const Args &...args) {
  LogInternal(getLogger(), LOG_LEVEL_OPERATION, message, args...);
}

void LogRequestedSpec(const TokenSpec &spec) {
  if (IsLoggingOperations()) {
    LogOperation("Requested token with spec `%1'", WriteTokenSpec(spec));
  }
}

/// The token has already been issued. The handler only processes the service's last leg.
void HandOverFinalLeg(NegotiationHandler &handler, const std::vector<std::uint8_t> &serviceLeg) {
  const std::shared_ptr<std::vector<std::uint8_t>> userLeg = handler.NegotiateLeg(serviceLeg);
  // The condition is inverted on purpose: the line is logged when the handler does not answer, and not when it does.
  if (!userLeg || userLeg->empty()) {
    LogInternal(getLogger(), LOG_LEVEL_CONTRACT_WARNING,
                "GSS contract error: non-empty user leg after negotiation is complete");
  }
}

} // namespace

SecurityTokenServiceImpl::SecurityTokenServiceImpl(std::shared_ptr<const RequestBuilder> requestBuilder,
                                                   std::shared_ptr<const Transport> transport,
                                                   std::shared_ptr<const ResponseHandler> responseHandler,
                                                   const Tarvel::Crypto::CertificateList &signingCertificates,
                                                   const ServiceOptions &options)
    : m_requestBuilder(std::move(requestBuilder)), m_transport(std::move(transport)),
      m_responseHandler(std::move(responseHandler)),
      m_returnedTokens(std::make_shared<const ReturnedTokens>(signingCertificates, options)),
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
    events.Hide(password);
    if (IsLoggingOperations()) {
      LogOperation("Requested token for subject `%1', spec `%2'", username, WriteTokenSpec(spec));
    }
    Request request;
    m_requestBuilder->BuildUserPassTokenRequest(username, password, spec, request);
    LogOperation("SecurityTokenServiceImpl::AcquireToken sending request");
    const Ref<Tarvel::Reader> response = Send(std::move(request), events);
    LogOperation("SecurityTokenServiceImpl::AcquireToken processing response");
    return AcquireFrom(response, events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByGSS(const TokenSpec &spec,
                                                                             NegotiationHandler &handler) const {
  return Run("AcquireTokenByGSS", [&](OperationEvents &events) {
    LogRequestedSpec(spec);
    SPNegoResponse spnego;
    Negotiate(spec, handler, spnego, events);
    return ToSamlToken(spnego.tokenXml, events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByCertificate(const TokenSpec &spec) const {
  return Run("AcquireTokenByCertificate", [&](OperationEvents &events) {
    LogRequestedSpec(spec);
    Request request;
    m_requestBuilder->BuildCertificateTokenRequest(spec, request);
    return AcquireFrom(Send(std::move(request), events), events);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByToken(const SamlToken &token,
                                                                               const TokenSpec &spec) const {
  return Run("AcquireTokenByToken", [&](OperationEvents &events) {
    events.HideToken(token);
    if (IsLoggingOperations()) {
      LogOperation("Requested token for %1 with spec `%2'", CreateRedactedDescription(token), WriteTokenSpec(spec));
    }
    Request request;
    m_requestBuilder->BuildExchangeTokenRequest(token, spec, request);
    return AcquireFrom(Send(std::move(request), events), events);
  });
}

bool SecurityTokenServiceImpl::ValidateSubject(const SamlToken &token) const {
  return Run("ValidateSubject", [&](OperationEvents &events) {
    events.HideToken(token);
    if (IsLoggingOperations()) {
      LogOperation("Validating subject of token %1", CreateRedactedDescription(token));
    }
    Request request;
    m_requestBuilder->BuildValidateSubjectRequest(token, request);
    const Ref<Tarvel::Reader> response = Send(std::move(request), events);
    bool isValid = false;
    events.Receive(*m_responseHandler, [&](const ResponseHandler &handler) {
      isValid = handler.HandleValidateSubjectResponse(response.get());
    });
    LogOperation("Result: %1", isValid);
    return isValid;
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RenewToken(const SamlToken &token,
                                                                      std::int64_t lifetimeSec) const {
  return Run("RenewToken", [&](OperationEvents &events) {
    events.HideToken(token);
    if (IsLoggingOperations()) {
      LogOperation("Renewing token %1 for %2 more seconds", CreateRedactedDescription(token), lifetimeSec);
    }
    Request request;
    m_requestBuilder->BuildRenewRequest(token, lifetimeSec, request);
    return AcquireFrom(Send(std::move(request), events), events, &ResponseHandler::HandleRenewTokenResponse);
  });
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireFrom(const Ref<Tarvel::Reader> &response,
                                                                       OperationEvents &events,
                                                                       ReadTokenXml readTokenXml) const {
  std::string tokenXml;
  events.Receive(*m_responseHandler,
                 [&](const ResponseHandler &handler) { (handler.*readTokenXml)(response.get(), tokenXml); });
  return ToSamlToken(tokenXml, events);
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(const std::string &xml) const {
  OperationEvents unobserved;
  return ToSamlToken(xml, unobserved);
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(const std::string &xml,
                                                                       OperationEvents &events) const {
  if (xml.empty()) {
    return nullptr;
  }
  std::shared_ptr<const SamlToken> token;
  try {
    token = m_returnedTokens->Verify(xml, events);
  } catch (const ParseException &error) {
    throw SsoException(error.what());
  }
  if (IsLoggingOperations()) {
    LogOperation("Successfully acquired token: %1", CreateRedactedDescription(*token));
  }
  return token;
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
  events.Receive(*m_responseHandler,
                 [&](const ResponseHandler &handler) { handler.HandleSPNegoResponse(response.get(), spnego); });
}

void SecurityTokenServiceImpl::Negotiate(const TokenSpec &spec, NegotiationHandler &handler, SPNegoResponse &spnego,
                                         OperationEvents &events) const {
  const std::shared_ptr<TransportSession> session = m_transport->CreateSession();
  for (int number = 1; spnego.tokenXml.empty(); ++number) {
    const std::shared_ptr<std::vector<std::uint8_t>> leg = handler.NegotiateLeg(spnego.leg);
    if (!leg) {
      throw Tarvel::InvalidArgumentException("Invalid NegotiationHandler: the returned leg may not be NULL");
    }
    events.SetLeg(number);
    events.HideLeg(*leg);
    if (spnego.contextId.empty()) {
      StartSPNegotiation(*session, *leg, spec, spnego, events);
    } else {
      ContinueSPNegotiation(*session, *leg, spnego.contextId, spnego, events);
    }
    events.HideLeg(spnego.leg);
    if (spnego.contextId.empty()) {
      throw CommunicationException(
          "Error processing the response to SPNego token request: no Context ID was returned.");
    }
  }
  if (!spnego.leg.empty()) {
    HandOverFinalLeg(handler, spnego.leg);
  }
}

} // namespace SsoClient
