// SPDX-License-Identifier: Apache-2.0

#include "operation/token_steps.h"

#include <ssoclient/descriptions.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/logger.h>
#include <tarvel/core/exception.h>

#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Service::LogInternal;

/// Checked before a description is made: making one costs far more than the log call.
bool IsLoggingOperations() {
  return getLogger().GetLevel() >= LOG_LEVEL_OPERATION;
}

template <typename... Args>
void LogWith(const char *message, const Args &...args) {
  LogInternal(getLogger(), LOG_LEVEL_OPERATION, message, args...);
}

void LogRequestedSpec(const TokenSpec &spec) {
  if (IsLoggingOperations()) {
    LogWith("Requested token with spec `%1'", WriteTokenSpec(spec));
  }
}

} // namespace

void LogOperation(const char *message) {
  LogWith(message);
}

TokenSteps::TokenSteps(std::shared_ptr<const RequestBuilder> requestBuilder,
                       std::shared_ptr<const ResponseHandler> responseHandler,
                       std::shared_ptr<const ReturnedTokens> returnedTokens)
    : m_requestBuilder(std::move(requestBuilder)), m_responseHandler(std::move(responseHandler)),
      m_returnedTokens(std::move(returnedTokens)) {}

void TokenSteps::ComposeByPassword(const std::string &username, const std::string &password, const TokenSpec &spec,
                                   Request &request, OperationEvents &events) const {
  events.Hide(password);
  if (IsLoggingOperations()) {
    LogWith("Requested token for subject `%1', spec `%2'", username, WriteTokenSpec(spec));
  }
  m_requestBuilder->BuildUserPassTokenRequest(username, password, spec, request);
}

void TokenSteps::ComposeByCertificate(const TokenSpec &spec, Request &request) const {
  LogRequestedSpec(spec);
  m_requestBuilder->BuildCertificateTokenRequest(spec, request);
}

void TokenSteps::ComposeByToken(const SamlToken &token, const TokenSpec &spec, Request &request,
                                OperationEvents &events) const {
  events.HideToken(token);
  if (IsLoggingOperations()) {
    LogWith("Requested token for %1 with spec `%2'", CreateRedactedDescription(token), WriteTokenSpec(spec));
  }
  m_requestBuilder->BuildExchangeTokenRequest(token, spec, request);
}

void TokenSteps::ComposeValidation(const SamlToken &token, Request &request, OperationEvents &events) const {
  events.HideToken(token);
  if (IsLoggingOperations()) {
    LogWith("Validating subject of token %1", CreateRedactedDescription(token));
  }
  m_requestBuilder->BuildValidateSubjectRequest(token, request);
}

void TokenSteps::ComposeRenewal(const SamlToken &token, std::int64_t lifetimeSec, Request &request,
                                OperationEvents &events) const {
  events.HideToken(token);
  if (IsLoggingOperations()) {
    LogWith("Renewing token %1 for %2 more seconds", CreateRedactedDescription(token), lifetimeSec);
  }
  m_requestBuilder->BuildRenewRequest(token, lifetimeSec, request);
}

std::shared_ptr<const SamlToken> TokenSteps::ReadIssued(Tarvel::Reader &response, OperationEvents &events) const {
  return ReadToken(response, events, &ResponseHandler::HandleAcquireTokenResponse);
}

std::shared_ptr<const SamlToken> TokenSteps::ReadRenewed(Tarvel::Reader &response, OperationEvents &events) const {
  return ReadToken(response, events, &ResponseHandler::HandleRenewTokenResponse);
}

bool TokenSteps::ReadValidity(Tarvel::Reader &response, OperationEvents &events) const {
  bool isValid = false;
  events.Receive(*m_responseHandler,
                 [&](const ResponseHandler &handler) { isValid = handler.HandleValidateSubjectResponse(&response); });
  LogWith("Result: %1", isValid);
  return isValid;
}

void TokenSteps::LogNegotiation(const TokenSpec &spec) {
  LogRequestedSpec(spec);
}

std::shared_ptr<std::vector<std::uint8_t>> TokenSteps::AskForLeg(NegotiationHandler &handler,
                                                                 const std::vector<std::uint8_t> &serviceLeg,
                                                                 int number, OperationEvents &events) {
  std::shared_ptr<std::vector<std::uint8_t>> leg = handler.NegotiateLeg(serviceLeg);
  if (!leg) {
    throw Tarvel::InvalidArgumentException("Invalid NegotiationHandler: the returned leg may not be NULL");
  }
  events.SetLeg(number);
  events.HideLeg(*leg);
  return leg;
}

void TokenSteps::ReadLeg(Tarvel::Reader &response, SPNegoResponse &spnego, OperationEvents &events) const {
  events.Receive(*m_responseHandler,
                 [&](const ResponseHandler &handler) { handler.HandleSPNegoResponse(&response, spnego); });
}

void TokenSteps::CheckLeg(const SPNegoResponse &spnego, OperationEvents &events) {
  events.HideLeg(spnego.leg);
  if (spnego.contextId.empty()) {
    throw CommunicationException("Error processing the response to SPNego token request: no Context ID was returned.");
  }
}

void TokenSteps::HandOverFinalLeg(NegotiationHandler &handler, const std::vector<std::uint8_t> &serviceLeg) {
  if (serviceLeg.empty()) {
    return;
  }
  const std::shared_ptr<std::vector<std::uint8_t>> userLeg = handler.NegotiateLeg(serviceLeg);
  // The condition is inverted on purpose: the line is logged when the handler does not answer, and not when it does.
  if (!userLeg || userLeg->empty()) {
    LogInternal(getLogger(), LOG_LEVEL_CONTRACT_WARNING,
                "GSS contract error: non-empty user leg after negotiation is complete");
  }
}

std::shared_ptr<const SamlToken> TokenSteps::ReadToken(Tarvel::Reader &response, OperationEvents &events,
                                                       ReadTokenXml readTokenXml) const {
  std::string tokenXml;
  events.Receive(*m_responseHandler,
                 [&](const ResponseHandler &handler) { (handler.*readTokenXml)(&response, tokenXml); });
  return ToSamlToken(tokenXml, events);
}

std::shared_ptr<const SamlToken> TokenSteps::ToSamlToken(const std::string &xml, OperationEvents &events) const {
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
    LogWith("Successfully acquired token: %1", CreateRedactedDescription(*token));
  }
  return token;
}

} // namespace SsoClient
