// SPDX-License-Identifier: Apache-2.0
/// @file
/// Stand-ins for the collaborators of the service. Their only state is what the test reads, and they are safe on any
/// thread.
///
/// The request builder writes its call and the arguments into the request. The transport records requests, and answers
/// with the text that the test's function returns. The response handler reads texts of a simple form:
/// "issued:XML", "renewed:XML", "valid:true", "valid:false", "leg:CONTEXT|BYTES|XML"; "fault:MESSAGE" is refused.

#pragma once

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "service/security_token_service_impl.h"
#include "transport/transport.h"

#include <tarvel/crypto/certificate.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace Testing {

using Bytes = std::vector<std::uint8_t>;

Bytes ToBytes(const std::string &text);
std::string ToString(const Bytes &bytes);

class RequestBuilderStandIn final : public SsoClient::RequestBuilder {
public:
  /// @param onCall called at the beginning of each call; if it throws, the builder refuses with that exception
  explicit RequestBuilderStandIn(std::function<void()> onCall = [] {});

  void BuildUserPassTokenRequest(const std::string &username, const std::string &password,
                                 const SsoClient::TokenSpec &spec, SsoClient::Request &request) const override;
  void BuildInitialSPNegoRequest(const SsoClient::TokenSpec &spec, const Bytes &leg,
                                 SsoClient::Request &request) const override;
  void BuildContinuedSPNegoRequest(const std::string &contextId, const Bytes &leg,
                                   SsoClient::Request &request) const override;
  void BuildCertificateTokenRequest(const SsoClient::TokenSpec &spec, SsoClient::Request &request) const override;
  void BuildExchangeTokenRequest(const SsoClient::SamlToken &, const SsoClient::TokenSpec &spec,
                                 SsoClient::Request &request) const override;
  void BuildValidateSubjectRequest(const SsoClient::SamlToken &, SsoClient::Request &request) const override;
  void BuildRenewRequest(const SsoClient::SamlToken &, std::int64_t lifetimeSec,
                         SsoClient::Request &request) const override;

private:
  void Fill(SsoClient::Request &request, const std::string &call) const;

  const std::function<void()> m_onCall;
};

/// Returns the service's answer to a request. If it throws, the transport fails with that exception.
using Answer = std::function<std::string(const SsoClient::Request &)>;

class TransportStandIn final : public SsoClient::Transport {
public:
  explicit TransportStandIn(Answer answer);

  std::shared_ptr<SsoClient::TransportSession> CreateSession() const override;

  /// The bodies of the requests, each after the number of its session: "1: UserPass …".
  std::vector<std::string> Sent() const;

  int CountSessions() const;

  /// How many sessions have not been released.
  int CountOpenSessions() const;

private:
  struct State;
  class Session;

  const std::shared_ptr<State> m_state;
};

class ResponseHandlerStandIn final : public SsoClient::ResponseHandler {
public:
  /// @param onCall called at the beginning of each call
  explicit ResponseHandlerStandIn(std::function<void()> onCall = [] {});

  void HandleAcquireTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const override;
  bool HandleValidateSubjectResponse(Tarvel::Reader *response) const override;
  void HandleRenewTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const override;
  void HandleSPNegoResponse(Tarvel::Reader *response, SsoClient::SPNegoResponse &spnego) const override;

private:
  std::string ReadAfter(const std::string &prefix, Tarvel::Reader *response) const;

  const std::function<void()> m_onCall;
};

/// A handler that answers with the legs of its script, which may be null, and records the legs of the service.
class NegotiationHandlerStandIn final : public SsoClient::NegotiationHandler {
public:
  explicit NegotiationHandlerStandIn(std::vector<std::shared_ptr<Bytes>> script);

  std::shared_ptr<Bytes> NegotiateLeg(const Bytes &serviceLeg) override;

  std::vector<std::string> received;

private:
  const std::vector<std::shared_ptr<Bytes>> m_script;
};

std::shared_ptr<Bytes> Leg(const std::string &text);

/// The certificate of the key that signed the fixture tokens.
Tarvel::Crypto::CertificateList TrustedCertificates();

std::shared_ptr<SsoClient::SecurityTokenServiceImpl> ServiceOn(
    const std::shared_ptr<const SsoClient::Transport> &transport, const std::function<void()> &onResponse = [] {});

/// A spec with that lifetime in seconds.
SsoClient::TokenSpec SpecFor(std::int64_t lifetimeSec);

} // namespace Testing
