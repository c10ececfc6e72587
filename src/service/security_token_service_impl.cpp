// SPDX-License-Identifier: Apache-2.0

#include "service/security_token_service_impl.h"

#include "service/operation_frame.h"

#include <ssoclient/create_saml_token.h>
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
                                                   const Tarvel::Crypto::CertificateList &signingCertificates)
    : m_requestBuilder(std::move(requestBuilder)), m_transport(std::move(transport)),
      m_responseHandler(std::move(responseHandler)), m_signingCertificates(signingCertificates) {}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireToken(const std::string &username,
                                                                        const std::string &password,
                                                                        const TokenSpec &spec) const {
  const OperationFrame frame("AcquireToken");
  if (IsLoggingOperations()) {
    LogOperation("Requested token for subject `%1', spec `%2'", username, WriteTokenSpec(spec));
  }
  Request request;
  m_requestBuilder->BuildUserPassTokenRequest(username, password, spec, request);
  LogOperation("SecurityTokenServiceImpl::AcquireToken sending request");
  const Ref<Tarvel::Reader> response = Send(std::move(request));
  LogOperation("SecurityTokenServiceImpl::AcquireToken processing response");
  return AcquireFrom(response);
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByGSS(const TokenSpec &spec,
                                                                             NegotiationHandler &handler) const {
  const OperationFrame frame("AcquireTokenByGSS");
  LogRequestedSpec(spec);
  SPNegoResponse spnego;
  Negotiate(spec, handler, spnego);
  return ToSamlToken(spnego.tokenXml);
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByCertificate(const TokenSpec &spec) const {
  const OperationFrame frame("AcquireTokenByCertificate");
  LogRequestedSpec(spec);
  Request request;
  m_requestBuilder->BuildCertificateTokenRequest(spec, request);
  return AcquireFrom(Send(std::move(request)));
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByToken(const SamlToken &token,
                                                                               const TokenSpec &spec) const {
  const OperationFrame frame("AcquireTokenByToken");
  if (IsLoggingOperations()) {
    LogOperation("Requested token for %1 with spec `%2'", CreateRedactedDescription(token), WriteTokenSpec(spec));
  }
  Request request;
  m_requestBuilder->BuildExchangeTokenRequest(token, spec, request);
  return AcquireFrom(Send(std::move(request)));
}

bool SecurityTokenServiceImpl::ValidateSubject(const SamlToken &token) const {
  const OperationFrame frame("ValidateSubject");
  if (IsLoggingOperations()) {
    LogOperation("Validating subject of token %1", CreateRedactedDescription(token));
  }
  Request request;
  m_requestBuilder->BuildValidateSubjectRequest(token, request);
  const Ref<Tarvel::Reader> response = Send(std::move(request));
  const bool isValid = m_responseHandler->HandleValidateSubjectResponse(response.get());
  LogOperation("Result: %1", isValid);
  return isValid;
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RenewToken(const SamlToken &token,
                                                                      std::int64_t lifetimeSec) const {
  const OperationFrame frame("RenewToken");
  if (IsLoggingOperations()) {
    LogOperation("Renewing token %1 for %2 more seconds", CreateRedactedDescription(token), lifetimeSec);
  }
  Request request;
  m_requestBuilder->BuildRenewRequest(token, lifetimeSec, request);
  return AcquireFrom(Send(std::move(request)), &ResponseHandler::HandleRenewTokenResponse);
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireFrom(const Ref<Tarvel::Reader> &response,
                                                                       ReadTokenXml readTokenXml) const {
  std::string tokenXml;
  ((*m_responseHandler).*readTokenXml)(response.get(), tokenXml);
  return ToSamlToken(tokenXml);
}

std::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(const std::string &xml) const {
  if (xml.empty()) {
    return nullptr;
  }
  std::shared_ptr<const SamlToken> token;
  try {
    token = CreateSamlToken(xml, m_signingCertificates);
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
  Request request;
  m_requestBuilder->BuildInitialSPNegoRequest(spec, leg, request);
  SendLeg(session, request, spnego);
}

void SecurityTokenServiceImpl::ContinueSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                                                     const std::string &contextId, SPNegoResponse &spnego) const {
  Request request;
  m_requestBuilder->BuildContinuedSPNegoRequest(contextId, leg, request);
  SendLeg(session, request, spnego);
}

Ref<Tarvel::Reader> SecurityTokenServiceImpl::Send(Request &&request) const {
  const Request own = std::move(request); // wiped on return
  Ref<Tarvel::Reader> response;
  m_transport->CreateSession()->SendRequest(own, response);
  return response;
}

void SecurityTokenServiceImpl::SendLeg(TransportSession &session, const Request &request,
                                       SPNegoResponse &spnego) const {
  Ref<Tarvel::Reader> response;
  session.SendRequest(request, response);
  m_responseHandler->HandleSPNegoResponse(response.get(), spnego);
}

void SecurityTokenServiceImpl::Negotiate(const TokenSpec &spec, NegotiationHandler &handler,
                                         SPNegoResponse &spnego) const {
  const std::shared_ptr<TransportSession> session = m_transport->CreateSession();
  while (spnego.tokenXml.empty()) {
    const std::shared_ptr<std::vector<std::uint8_t>> leg = handler.NegotiateLeg(spnego.leg);
    if (!leg) {
      throw Tarvel::InvalidArgumentException("Invalid NegotiationHandler: the returned leg may not be NULL");
    }
    if (spnego.contextId.empty()) {
      StartSPNegotiation(*session, *leg, spec, spnego);
    } else {
      ContinueSPNegotiation(*session, *leg, spnego.contextId, spnego);
    }
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
