// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenSteps`, the steps of the operations of a service or a client, except sending.

#pragma once

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "operation/operation_events.h"
#include "operation/returned_tokens.h"

#include <ssoclient/negotiation_handler.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_spec.h>
#include <tarvel/io/reader.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// Composes requests and reads responses: hides the secrets from the observer, writes to the log, and verifies the
/// returned tokens. Copies share the collaborators. Immutable, so any number of threads may use it.
class TokenSteps {
public:
  TokenSteps(std::shared_ptr<const RequestBuilder> requestBuilder,
             std::shared_ptr<const ResponseHandler> responseHandler,
             std::shared_ptr<const ReturnedTokens> returnedTokens);

  /// Each of these fills `request`, which is empty, or throws what the request builder throws.
  void ComposeByPassword(const std::string &username, const std::string &password, const TokenSpec &spec,
                         Request &request, OperationEvents &events) const;
  void ComposeByCertificate(const TokenSpec &spec, Request &request) const;
  void ComposeByToken(const SamlToken &token, const TokenSpec &spec, Request &request, OperationEvents &events) const;
  void ComposeValidation(const SamlToken &token, Request &request, OperationEvents &events) const;
  void ComposeRenewal(const SamlToken &token, std::int64_t lifetimeSec, Request &request,
                      OperationEvents &events) const;

  /// The verified token in the response; null when the text in the place of the token is empty.
  std::shared_ptr<const SamlToken> ReadIssued(Tarvel::Reader &response, OperationEvents &events) const;
  std::shared_ptr<const SamlToken> ReadRenewed(Tarvel::Reader &response, OperationEvents &events) const;

  /// Whether the service reports that the token is valid.
  bool ReadValidity(Tarvel::Reader &response, OperationEvents &events) const;

  /// Logs the token that a negotiation requests.
  static void LogNegotiation(const TokenSpec &spec);

  /// The next leg of `handler`. `number` is that of the message with the leg, from 1.
  /// @throws Tarvel::InvalidArgumentException when the handler returns null.
  static std::shared_ptr<std::vector<std::uint8_t>> AskForLeg(NegotiationHandler &handler,
                                                              const std::vector<std::uint8_t> &serviceLeg, int number,
                                                              OperationEvents &events);

  /// Sets `spnego` to the response to a leg.
  void ReadLeg(Tarvel::Reader &response, SPNegoResponse &spnego, OperationEvents &events) const;

  /// @throws CommunicationException when the response to a leg does not identify the negotiation.
  static void CheckLeg(const SPNegoResponse &spnego, OperationEvents &events);

  /// Passes the last leg of the service, if there is one, to the handler. The token has already been issued.
  static void HandOverFinalLeg(NegotiationHandler &handler, const std::vector<std::uint8_t> &serviceLeg);

  /// The verified token in `xml`; null when `xml` is empty.
  /// @throws what `CreateSamlToken` throws, except that a ParseException becomes an SsoException with the same message.
  std::shared_ptr<const SamlToken> ToSamlToken(const std::string &xml, OperationEvents &events) const;

  const RequestBuilder &GetRequestBuilder() const noexcept { return *m_requestBuilder; }

private:
  using ReadTokenXml = void (ResponseHandler::*)(Tarvel::Reader *, std::string &) const;

  std::shared_ptr<const SamlToken> ReadToken(Tarvel::Reader &response, OperationEvents &events,
                                             ReadTokenXml readTokenXml) const;

  std::shared_ptr<const RequestBuilder> m_requestBuilder;
  std::shared_ptr<const ResponseHandler> m_responseHandler;
  std::shared_ptr<const ReturnedTokens> m_returnedTokens;
};

/// Logs a line about the progress of an operation.
void LogOperation(const char *message);

} // namespace SsoClient
