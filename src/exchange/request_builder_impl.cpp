// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder_impl.h"

#include "compose/ws_addressing.h"
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

/// Refuses a spec that needs `element` if the dialect never has it: the request would silently ask for less.
void ValidateStatement(const char *field, bool value, ServiceDialect::Statement when, const char *element) {
  if (value && when == ServiceDialect::Statement::NEVER) {
    throw Tarvel::InvalidArgumentException(std::string(field) + " is true, but the dialect of the service has no " +
                                           element);
  }
}

} // namespace

RequestBuilderImpl::RequestBuilderImpl(const boost::optional<HolderOfKeyConfig> &holderOfKeyConfig)
    : RequestBuilderImpl(holderOfKeyConfig, ServiceDialect(), std::string()) {}

RequestBuilderImpl::RequestBuilderImpl(const boost::optional<HolderOfKeyConfig> &holderOfKeyConfig,
                                       const ServiceDialect &dialect, const std::string &serviceAddress)
    : m_holderOfKeyConfig(holderOfKeyConfig), m_dialect(dialect), m_serviceAddress(serviceAddress) {
  if (m_holderOfKeyConfig && !(m_holderOfKeyConfig->privateKey && m_holderOfKeyConfig->certificate)) {
    throw Tarvel::InvalidArgumentException("HolderOfKeyConfig lacks its private key or its certificate");
  }
}

void RequestBuilderImpl::BuildUserPassTokenRequest(const std::string &username, const std::string &password,
                                                   const TokenSpec &spec, Request &request) const {
  ValidateSpec(spec);
  const XMLBuilderPtr header = SecurityHeaderWith(WsseUsernameTokenBuilder(username, password));
  const XMLBuilderPtr body =
      AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec, m_dialect, GetCertificate());
  request.soapAction = Request::ISSUE;
  // On purpose, a delegate overrides the confirmation for the signature, but not for the body.
  SetBody(request, BuildTokenRequest(ConfOverrideWithDelegate(spec), header, body, request.soapAction));
}

void RequestBuilderImpl::BuildInitialSPNegoRequest(const TokenSpec &spec, const std::vector<std::uint8_t> &leg,
                                                   Request &request) const {
  ValidateSpec(spec);
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body = std::make_shared<const XMLBodyBuilderInitialSPNego>(
      GetEffectiveConfirmationType(spec.confirmation), spec, leg, m_dialect, GetCertificate());
  request.soapAction = Request::ISSUE;
  SetBody(request, BuildTokenRequest(ConfOverrideWithDelegate(spec), header, body, request.soapAction));
}

void RequestBuilderImpl::BuildContinuedSPNegoRequest(const std::string &contextId, const std::vector<std::uint8_t> &leg,
                                                     Request &request) const {
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body = std::make_shared<const XMLBodyBuilderContinuedSPNego>(contextId, leg);
  request.soapAction = Request::CHALLANGE;
  SetBody(request, BuildUnSignedRequest(header, body, request.soapAction));
}

void RequestBuilderImpl::BuildCertificateTokenRequest(const TokenSpec &spec, Request &request) const {
  ValidateSpec(spec);
  ValidateHokIsConfigured(ACQUIRE_BY_CERTIFICATE);
  if (spec.confirmation != TokenSpec::CONFIRMATION_DEFAULT) {
    throw Tarvel::InvalidArgumentException(std::string("TokenSpec::confirmation must be CONFIRMATION_DEFAULT for ") +
                                           ACQUIRE_BY_CERTIFICATE);
  }
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body =
      AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec, m_dialect, GetCertificate());
  request.soapAction = Request::ISSUE;
  SetBody(request, BuildCertRefSignedRequest(header, body, request.soapAction));
}

void RequestBuilderImpl::BuildExchangeTokenRequest(const SamlToken &token, const TokenSpec &spec,
                                                   Request &request) const {
  ValidateSpec(spec);
  ValidateHokIsConfigured(ACQUIRE_BY_TOKEN);
  const XMLBuilderPtr header = SecurityHeaderWith(InsertSamlTokenBuilder(token));
  const XMLBuilderPtr body =
      ExchangeSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec, m_dialect, GetCertificate());
  request.soapAction = Request::ISSUE;
  SetBody(request, BuildSamlRefSignedRequest(token.GetId(), header, body, request.soapAction));
}

void RequestBuilderImpl::BuildValidateSubjectRequest(const SamlToken &token, Request &request) const {
  request.soapAction = Request::VALIDATE;
  const XMLBuilderPtr body = ValidateSecurityTokenBuilder(token);
  const XMLBuilderPtr header = SecurityHeader();
  SetBody(request, BuildUnSignedRequest(header, body, request.soapAction));
}

void RequestBuilderImpl::BuildRenewRequest(const SamlToken &token, std::int64_t lifetimeSec, Request &request) const {
  ValidateLifetime(lifetimeSec);
  ValidateHokIsConfigured(RENEW_TOKEN);
  ValidateTokenIsHok(token, RENEW_TOKEN);
  const XMLBuilderPtr header = SecurityHeader();
  const XMLBuilderPtr body = RenewSecurityTokenBuilder(token, lifetimeSec, m_dialect);
  request.soapAction = Request::RENEW;
  SetBody(request, BuildCertRefSignedRequest(header, body, request.soapAction));
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

void RequestBuilderImpl::ValidateSpec(const TokenSpec &spec) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  ValidateStatement("TokenSpec::delegable", spec.delegable, m_dialect.delegatable, "wst:Delegatable");
  ValidateStatement("TokenSpec::renewable", spec.renewable, m_dialect.renewing, "wst:Renewing");
}

const Tarvel::Crypto::Certificate *RequestBuilderImpl::GetCertificate() const {
  return m_holderOfKeyConfig ? m_holderOfKeyConfig->certificate.get() : nullptr;
}

void RequestBuilderImpl::SetBody(Request &request, std::string body) const {
  request.declaresCharset = m_dialect.declaresCharset;
  request.body.swap(body);
  Tarvel::SecureWipe(body);
}

HeaderBuilders RequestBuilderImpl::GetAddressing(const std::string &action) const {
  return m_dialect.addressing ? WsAddressingHeaderBuilders(m_serviceAddress, action) : HeaderBuilders();
}

std::string RequestBuilderImpl::BuildTokenRequest(TokenSpec::Confirmation confirmation, const XMLBuilderPtr &header,
                                                  const XMLBuilderPtr &body, const std::string &action) const {
  if (GetEffectiveConfirmationType(confirmation) == SamlToken::HOLDER_OF_KEY) {
    return BuildCertRefSignedRequest(header, body, action);
  }
  return BuildUnSignedRequest(header, body, action);
}

std::string RequestBuilderImpl::BuildUnSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                                     const std::string &action) const {
  return SerializeToXML(SoapBuilder(header, body, GetAddressing(action)));
}

std::string RequestBuilderImpl::BuildCertRefSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                                          const std::string &action) const {
  return SerializeToXML(CertRefSignedSoapBuilder(header, body, m_holderOfKeyConfig->privateKey.get(),
                                                 m_holderOfKeyConfig->certificate.get(), GetAddressing(action)));
}

std::string RequestBuilderImpl::BuildSamlRefSignedRequest(const std::string &tokenId, const XMLBuilderPtr &header,
                                                          const XMLBuilderPtr &body, const std::string &action) const {
  return SerializeToXML(SamlRefSignedSoapBuilder(header, body, m_holderOfKeyConfig->privateKey.get(), tokenId,
                                                 m_dialect, GetAddressing(action)));
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
