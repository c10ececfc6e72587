// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecurityTokenServiceImpl`, which runs each operation in the same steps: compose, send, read, verify.

#pragma once

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "operation/operation_events.h"
#include "operation/token_steps.h"
#include "transport/transport.h"

#include <ssoclient/security_token_service.h>
#include <ssoclient/service_options.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/io/reader.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// Coordinates three collaborators, which compose requests, send them and read responses. Copies share the
/// collaborators, which must be safe on any thread. An asynchronous operation runs on a copy, so it may outlive the
/// service that started it.
class SecurityTokenServiceImpl final : public SecurityTokenService {
public:
  SecurityTokenServiceImpl(std::shared_ptr<const RequestBuilder> requestBuilder,
                           std::shared_ptr<const Transport> transport,
                           std::shared_ptr<const ResponseHandler> responseHandler,
                           const Tarvel::Crypto::CertificateList &signingCertificates,
                           const ServiceOptions &options = {});
  SecurityTokenServiceImpl(const SecurityTokenServiceImpl &) = default;

  std::shared_ptr<const SamlToken> AcquireToken(const std::string &username, const std::string &password,
                                                const TokenSpec &spec) const override;
  std::shared_ptr<const SamlToken> AcquireTokenByGSS(const TokenSpec &spec, NegotiationHandler &handler) const override;
  std::shared_ptr<const SamlToken> AcquireTokenByCertificate(const TokenSpec &spec) const override;
  std::shared_ptr<const SamlToken> AcquireTokenByToken(const SamlToken &token, const TokenSpec &spec) const override;
  bool ValidateSubject(const SamlToken &token) const override;
  std::shared_ptr<const SamlToken> RenewToken(const SamlToken &token, std::int64_t lifetimeSec) const override;

  void AcquireTokenAsync(const std::string &username, const std::string &password, const TokenSpec &spec,
                         const TokenCompletion &completion) const override;
  void AcquireTokenByGssAsync(const TokenSpec &spec, const std::shared_ptr<NegotiationHandler> &handler,
                              const TokenCompletion &completion) const override;
  void AcquireTokenByCertificateAsync(const TokenSpec &spec, const TokenCompletion &completion) const override;
  void AcquireTokenByTokenAsync(const std::shared_ptr<const SamlToken> &token, const TokenSpec &spec,
                                const TokenCompletion &completion) const override;
  void ValidateSubjectAsync(const std::shared_ptr<const SamlToken> &token,
                            const ValidityCompletion &completion) const override;
  void RenewTokenAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                       const TokenCompletion &completion) const override;

  /// The verified token in `xml`; null when `xml` is empty.
  /// @throws what `CreateSamlToken` throws, except that a ParseException becomes an SsoException with the same message.
  std::shared_ptr<const SamlToken> ToSamlToken(const std::string &xml) const;

  /// Sends the first leg of a negotiation and sets `spnego` to the service's response.
  void StartSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg, const TokenSpec &spec,
                          SPNegoResponse &spnego) const;
  void StartSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg, const TokenSpec &spec,
                          SPNegoResponse &spnego, OperationEvents &events) const;

  /// The same for a later leg. `contextId` may refer to the text in `spnego`.
  void ContinueSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                             const std::string &contextId, SPNegoResponse &spnego) const;
  void ContinueSPNegotiation(TransportSession &session, const std::vector<std::uint8_t> &leg,
                             const std::string &contextId, SPNegoResponse &spnego, OperationEvents &events) const;

private:
  /// Runs `operation` once with its events, between the first and the last line of its log.
  template <typename Operation>
  auto Run(const char *name, const Operation &operation) const;
  /// Posts in a new session. Session and request are destroyed before this returns, so that a password in the request
  /// does not stay in memory while the response is processed.
  Tarvel::Ref<Tarvel::Reader> Send(Request &&request, OperationEvents &events) const;
  void SendLeg(TransportSession &session, Request &request, SPNegoResponse &spnego, OperationEvents &events) const;
  /// Exchanges legs until the service issues a token or something throws.
  void Negotiate(const TokenSpec &spec, NegotiationHandler &handler, SPNegoResponse &spnego,
                 OperationEvents &events) const;
  std::shared_ptr<const SecurityTokenService> ShareCopy() const;

  std::shared_ptr<const RequestBuilder> m_requestBuilder;
  std::shared_ptr<const Transport> m_transport;
  TokenSteps m_steps;
  std::shared_ptr<OperationObserver> m_observer;
};

} // namespace SsoClient
