// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder_impl.h"

#include "compose/soap_envelope.h"
#include "compose/ws_security.h"
#include "compose/ws_trust.h"
#include "exchange/spnego_body.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/secure_wipe.h>

namespace SsoClient {

namespace {

constexpr int TIMESTAMP_VALIDITY_MINUTES = 10;
const char ACQUIRE_BY_CERTIFICATE[] = "acquire token by certificate";
const char ACQUIRE_BY_TOKEN[] = "acquire token by token";
const char RENEW_TOKEN[] = "renew token";

XMLBuilderPtr SecurityHeader() {
  return WsSecurityHeaderBuilder(TIMESTAMP_VALIDITY_MINUTES);
}

/// The security header with `token` after the timestamp.
XMLBuilderPtr SecurityHeaderWith(const XMLBuilderPtr &token) {
  auto header = std::make_shared<XMLCompositeBuilder>(SecurityHeader());
  header->Add(token);
  return header;
}

/// Sets the body of the request. An earlier body is wiped, because it may be secret, too.
void SetBody(Request &request, std::string body) {
  request.body.swap(body);
  Tarvel::SecureWipe(body);
}

} // namespace

RequestBuilderImpl::RequestBuilderImpl(const boost::optional<HolderOfKeyConfig> &holderOfKeyConfig)
    : m_holderOfKeyConfig(holderOfKeyConfig) {
  if (m_holderOfKeyConfig && !(m_holderOfKeyConfig->privateKey && m_holderOfKeyConfig->certificate)) {
    throw Tarvel::InvalidArgumentException("HolderOfKeyConfig lacks its private key or its certificate");
  }
}

void RequestBuilderImpl::BuildUserPassTokenRequest(const std::string &username, const std::string &password,
                                                   const TokenSpec &spec, Request &request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  const XMLBuilderPtr header = SecurityHeaderWith(WsseUsernameTokenBuilder(username, password));
  const XMLBuilderPtr body = AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
  request.soapAction = Request::ISSUE;
  // On purpose, the body depends on the spec's own confirmation, but the signature on that which a delegate overrides.
  SetBody(request, BuildTokenRequest(ConfOverrideWithDelegate(spec), header, body));
}

void RequestBuilderImpl::BuildInitialSPNegoRequest(const TokenSpec &spec, const std::vector<std::uint8_t> &leg,
                                                   Request &request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body =
      std::make_shared<const XMLBodyBuilderInitialSPNego>(GetEffectiveConfirmationType(spec.confirmation), spec, leg);
  request.soapAction = Request::ISSUE;
  SetBody(request, BuildTokenRequest(ConfOverrideWithDelegate(spec), header, body));
}

void RequestBuilderImpl::BuildContinuedSPNegoRequest(const std::string &contextId, const std::vector<std::uint8_t> &leg,
                                                     Request &request) const {
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body = std::make_shared<const XMLBodyBuilderContinuedSPNego>(contextId, leg);
  request.soapAction = Request::CHALLANGE;
  SetBody(request, BuildUnSignedRequest(header, body));
}

void RequestBuilderImpl::BuildCertificateTokenRequest(const TokenSpec &spec, Request &request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  ValidateHokIsConfigured(ACQUIRE_BY_CERTIFICATE);
  if (spec.confirmation != TokenSpec::CONFIRMATION_DEFAULT) {
    throw Tarvel::InvalidArgumentException(std::string("TokenSpec::confirmation must be CONFIRMATION_DEFAULT for ") +
                                           ACQUIRE_BY_CERTIFICATE);
  }
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body = AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
  request.soapAction = Request::ISSUE;
  SetBody(request, BuildCertRefSignedRequest(header, body));
}

void RequestBuilderImpl::BuildExchangeTokenRequest(const SamlToken &token, const TokenSpec &spec,
                                                   Request &request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  ValidateHokIsConfigured(ACQUIRE_BY_TOKEN);
  const XMLBuilderPtr header = SecurityHeaderWith(InsertSamlTokenBuilder(token));
  const XMLBuilderPtr body = ExchangeSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
  request.soapAction = Request::ISSUE;
  SetBody(request, BuildSamlRefSignedRequest(token.GetId(), header, body));
}

void RequestBuilderImpl::BuildValidateSubjectRequest(const SamlToken &token, Request &request) const {
  request.soapAction = Request::VALIDATE;
  const XMLBuilderPtr body = ValidateSecurityTokenBuilder(token);
  const XMLBuilderPtr header = SecurityHeader();
  SetBody(request, BuildUnSignedRequest(header, body));
}

void RequestBuilderImpl::BuildRenewRequest(const SamlToken &token, std::int64_t lifetimeSec, Request &request) const {
  ValidateLifetime(lifetimeSec);
  ValidateHokIsConfigured(RENEW_TOKEN);
  ValidateTokenIsHok(token, RENEW_TOKEN);
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body = RenewSecurityTokenBuilder(token, lifetimeSec);
  request.soapAction = Request::RENEW;
  SetBody(request, BuildCertRefSignedRequest(header, body));
}

void RequestBuilderImpl::ValidateHokIsConfigured(const std::string &actionName) const {
  if (!m_holderOfKeyConfig) {
    throw Tarvel::InvalidStateException("No HolderOfKeyConfig provided. Unable to " + actionName);
  }
}

SamlToken::ConfirmationType
RequestBuilderImpl::GetEffectiveConfirmationType(TokenSpec::Confirmation confirmation) const {
  const bool holderOfKey = m_holderOfKeyConfig && confirmation == TokenSpec::CONFIRMATION_DEFAULT;
  return holderOfKey ? SamlToken::HOLDER_OF_KEY : SamlToken::BEARER;
}

std::string RequestBuilderImpl::BuildTokenRequest(TokenSpec::Confirmation confirmation, const XMLBuilderPtr &header,
                                                  const XMLBuilderPtr &body) const {
  if (GetEffectiveConfirmationType(confirmation) == SamlToken::HOLDER_OF_KEY) {
    return BuildCertRefSignedRequest(header, body);
  }
  return BuildUnSignedRequest(header, body);
}

std::string RequestBuilderImpl::BuildUnSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body) const {
  return SerializeToXML(SoapBuilder(header, body));
}

std::string RequestBuilderImpl::BuildCertRefSignedRequest(const XMLBuilderPtr &header,
                                                          const XMLBuilderPtr &body) const {
  return SerializeToXML(CertRefSignedSoapBuilder(header, body, m_holderOfKeyConfig->privateKey.get(),
                                                 m_holderOfKeyConfig->certificate.get()));
}

std::string RequestBuilderImpl::BuildSamlRefSignedRequest(const std::string &tokenId, const XMLBuilderPtr &header,
                                                          const XMLBuilderPtr &body) const {
  return SerializeToXML(SamlRefSignedSoapBuilder(header, body, m_holderOfKeyConfig->privateKey.get(), tokenId));
}

void ValidateLifetime(std::int64_t lifetimeSec) {
  if (lifetimeSec <= 0) {
    throw Tarvel::InvalidArgumentException("Token lifetime must be positive");
  }
}

void ValidateTokenIsHok(const SamlToken &token, const std::string &actionName) {
  if (token.GetConfirmationMethod() != SamlToken::HOLDER_OF_KEY) {
    throw Tarvel::InvalidArgumentException("Unable to " + actionName + ": the provided token must be Holder Of Key");
  }
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): a parameter by value is the established form.
TokenSpec::Confirmation ConfOverrideWithDelegate(TokenSpec spec) {
  return spec.delegateTo ? TokenSpec::CONFIRMATION_NONE : spec.confirmation;
}

} // namespace SsoClient
