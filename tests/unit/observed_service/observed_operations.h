// SPDX-License-Identifier: Apache-2.0
/// @file
/// The operations of an observed service. Only its network is replaced: request builder and response handler are real.

#pragma once

#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "support/data_file.h"
#include "support/identity.h"
#include "support/recorded_events.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"

#include <ssoclient/create_saml_token.h>
#include <tarvel/core/string_util.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace Testing {

constexpr const char *CANARY_PASSWORD = "canary-<password>&\"long\"";
constexpr const char *CANARY_LEG = "canary leg of the client";

/// A service that answers each request with the result of `answer`.
inline std::shared_ptr<SsoClient::SecurityTokenServiceImpl> ObservedService(Answer answer,
                                                                            const SsoClient::ServiceOptions &options) {
  return std::make_shared<SsoClient::SecurityTokenServiceImpl>(
      std::make_shared<const SsoClient::RequestBuilderImpl>(HolderIdentity()),
      std::make_shared<TransportStandIn>(std::move(answer)), std::make_shared<const SsoClient::ResponseHandlerImpl>(),
      TrustedCertificates(), options);
}

/// The token that operations exchange, renew and validate.
inline const SsoClient::SamlToken &HeldToken() {
  static const auto token = SsoClient::CreateSamlToken(ReadDataFile("tokens/holder-of-key.xml"), TrustedCertificates());
  return *token;
}

struct ObservedOperation {
  const char *name;
  const char *action;
  std::string leg; ///< the end of its lines about messages
  std::function<void(const SsoClient::SecurityTokenService &)> run;
  std::function<std::string(const std::string &)> respond; ///< makes a response from the text of a token
};

inline void PrintTo(const ObservedOperation &operation, std::ostream *out) {
  *out << operation.name;
}

inline std::string FinalLegWith(const std::string &token) {
  return FinalLeg("ctx", "", token);
}

inline std::string ValidResponse(const std::string &) {
  return ValidateResponse("http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid");
}

inline std::vector<ObservedOperation> ObservedOperations() {
  using SsoClient::Request;
  using Service = SsoClient::SecurityTokenService;
  return {
      {"AcquireToken", Request::ISSUE, "",
       [](const Service &service) { service.AcquireToken("alice", CANARY_PASSWORD, SpecFor(60)); }, IssueResponse},
      {"AcquireTokenByGSS", Request::ISSUE, ", leg 1",
       [](const Service &service) {
         NegotiationHandlerStandIn handler({Leg(CANARY_LEG), Leg(CANARY_LEG)});
         service.AcquireTokenByGSS(SpecFor(60), handler);
       },
       FinalLegWith},
      {"AcquireTokenByCertificate", Request::ISSUE, "",
       [](const Service &service) { service.AcquireTokenByCertificate(SpecFor(60)); }, IssueResponse},
      {"AcquireTokenByToken", Request::ISSUE, "",
       [](const Service &service) { service.AcquireTokenByToken(HeldToken(), SpecFor(60)); }, IssueResponse},
      {"ValidateSubject", Request::VALIDATE, "", [](const Service &service) { service.ValidateSubject(HeldToken()); },
       ValidResponse},
      {"RenewToken", Request::RENEW, "", [](const Service &service) { service.RenewToken(HeldToken(), 60); },
       RenewResponse},
  };
}

} // namespace Testing
