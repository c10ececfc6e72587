// SPDX-License-Identifier: Apache-2.0

#include "compose/ws_trust.h"

#include "compose/advice_elements.h"
#include "compose/wire_names.h"
#include "compose/ws_security.h"
#include "model/namespaces.h"
#include "xml/date_time_text.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/system/date_time.h>

namespace SsoClient {

namespace {

std::string BooleanText(bool value) {
  return value ? "true" : "false";
}

XMLCompositePtr RequestSecurityTokenBuilder(const std::string &tokenType, const std::string &requestType) {
  auto request = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wst", "RequestSecurityToken", {{"xmlns:wst", std::string(Namespaces::WST)}}));
  request->Add(TextElementBuilder("wst", "TokenType", tokenType))
      .Add(TextElementBuilder("wst", "RequestType", requestType));
  return request;
}

/// The element `name`, whose only child is the assertion element of the token.
XMLBuilderPtr TokenTargetBuilder(const std::string &name, const SamlToken &token) {
  auto target = std::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", name));
  target->Add(InsertSamlTokenBuilder(token));
  return target;
}

bool IsWritten(ServiceDialect::Statement when, bool value) {
  return when == ServiceDialect::Statement::ALWAYS || (when == ServiceDialect::Statement::WHEN_TRUE && value);
}

/// The element for the party to which the token is delegated, still empty.
XMLBuilderPtr DelegationElementBuilder(ServiceDialect::Delegation delegation) {
  switch (delegation) {
  case ServiceDialect::Delegation::ON_BEHALF_OF:
    return ElementBuilder("wst", "OnBehalfOf");
  case ServiceDialect::Delegation::ACT_AS:
    return ElementBuilder("wst14", "ActAs", {{"xmlns:wst14", std::string(Namespaces::WST14)}});
  case ServiceDialect::Delegation::DELEGATE_TO:
    break;
  }
  return ElementBuilder("wst", "DelegateTo");
}

} // namespace

std::string RequestedTokenType(const ServiceDialect &dialect) {
  return dialect.tokenType.empty() ? std::string(Namespaces::SAML) : dialect.tokenType;
}

XMLCompositePtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                                                  const ServiceDialect &dialect) {
  const std::string keyType =
      confirmation == SamlToken::BEARER ? WstUris::KEY_TYPE_BEARER : WstUris::KEY_TYPE_PUBLIC_KEY;
  XMLCompositePtr request = RequestSecurityTokenBuilder(RequestedTokenType(dialect), WstUris::ISSUE);
  if (dialect.appliesTo) {
    request->Add(WspAppliesToBuilder(*dialect.appliesTo));
  }
  request->Add(TextElementBuilder("wst", "KeyType", keyType)).Add(WssuLifetimeBuilder(spec.tokenLifetimeSec));
  if (IsWritten(dialect.renewing, spec.renewable)) {
    request->Add(WstRenewingBuilder(spec.renewable));
  }
  if (IsWritten(dialect.delegatable, spec.delegable)) {
    request->Add(TextElementBuilder("wst", "Delegatable", BooleanText(spec.delegable)));
  }
  if (spec.delegateTo) {
    request->Add(WstDelegateToBuilder(*spec.delegateTo, dialect));
  }
  if (!spec.audienceRestriction.empty()) {
    request->Add(WstParticipantsBuilders(spec.audienceRestriction));
  }
  if (!spec.advice.empty()) {
    request->Add(RsaAdviceSetBuilder(spec.advice));
  }
  return request;
}

XMLCompositePtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                                            const ServiceDialect &dialect,
                                            const Tarvel::Crypto::Certificate *certificate) {
  XMLCompositePtr request = ExchangeSecurityTokenBuilder(confirmation, spec, dialect, certificate);
  if (confirmation == SamlToken::HOLDER_OF_KEY && dialect.useKey == ServiceDialect::UseKey::REFERENCE) {
    request->Add(ElementBuilder("wst", "UseKey", {{"Sig", std::string(WireNames::HOLDER_OF_KEY_SIGNATURE_ID)}}));
  }
  return request;
}

XMLCompositePtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                                             const ServiceDialect &dialect,
                                             const Tarvel::Crypto::Certificate *certificate) {
  XMLCompositePtr request = CommonAcquireSecurityTokenBuilder(confirmation, spec, dialect);
  if (confirmation == SamlToken::HOLDER_OF_KEY && dialect.useKey == ServiceDialect::UseKey::CERTIFICATE) {
    if (!certificate) {
      throw Tarvel::InvalidArgumentException("wst:UseKey needs a certificate");
    }
    request->Add(WstUseKeyBuilder(*certificate));
  }
  return request;
}

XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken &token, std::int64_t lifetimeSec,
                                        const ServiceDialect &dialect) {
  XMLCompositePtr request = RequestSecurityTokenBuilder(RequestedTokenType(dialect), WstUris::RENEW);
  request->Add(WssuLifetimeBuilder(lifetimeSec)).Add(TokenTargetBuilder("RenewTarget", token));
  return request;
}

XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken &token) {
  XMLCompositePtr request = RequestSecurityTokenBuilder(WstUris::TOKEN_TYPE_STATUS, WstUris::VALIDATE);
  request->Add(TokenTargetBuilder("ValidateTarget", token));
  return request;
}

XMLBuilderPtr WssuLifetimeBuilder(std::int64_t seconds) {
  const Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
  const Tarvel::System::DateTime expires = now.PlusSeconds(seconds);
  auto lifetime = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wst", "Lifetime", {{"xmlns:wsu", std::string(Namespaces::WSU)}}));
  lifetime->Add(TextElementBuilder("wsu", "Created", DateTimeFormatter(now)))
      .Add(TextElementBuilder("wsu", "Expires", DateTimeFormatter(expires)));
  return lifetime;
}

XMLBuilderPtr WstRenewingBuilder(bool allow) {
  return ElementBuilder("wst", "Renewing", {{"Allow", BooleanText(allow)}, {"OK", BooleanText(false)}});
}

XMLBuilderPtr WstDelegateToBuilder(const std::string &name, const ServiceDialect &dialect) {
  auto delegateTo = std::make_shared<XMLCompositeBuilder>(DelegationElementBuilder(dialect.delegation));
  delegateTo->Add(WsseUsernameTokenBuilder(name));
  return delegateTo;
}

XMLBuilderPtr WstUseKeyBuilder(const Tarvel::Crypto::Certificate &certificate) {
  auto useKey = std::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", "UseKey"));
  useKey->Add(DsCertificateKeyInfoBuilder(certificate));
  return useKey;
}

XMLBuilderPtr WspAppliesToBuilder(const std::string &address) {
  auto appliesTo = std::make_shared<XMLCompositeBuilder>(ElementBuilder(
      "wsp", "AppliesTo", {{"xmlns:wsa", std::string(Namespaces::WSA)}, {"xmlns:wsp", std::string(Namespaces::WSP)}}));
  appliesTo->Add(WsaEndpointAddressReferenceBuilder(address));
  return appliesTo;
}

XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string> &audience) {
  auto participants = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wst", "Participants", {{"xmlns:wsa", std::string(Namespaces::WSA)}}));
  for (const std::string &address : audience) {
    participants->Add(WstParticipantBuilder(address));
  }
  return participants;
}

XMLBuilderPtr WstParticipantBuilder(const std::string &address) {
  auto participant = std::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", "Participant"));
  participant->Add(WsaEndpointAddressReferenceBuilder(address));
  return participant;
}

XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string &address) {
  auto reference = std::make_shared<XMLCompositeBuilder>(ElementBuilder("wsa", "EndpointReference"));
  reference->Add(TextElementBuilder("wsa", "Address", address));
  return reference;
}

XMLBuilderPtr WstSPNegoBinExchangeBuilder(const std::vector<std::uint8_t> &leg) {
  return TextElementBuilder(
      "wst", "BinaryExchange",
      {{"EncodingType", std::string(WireNames::BASE64_BINARY)}, {"ValueType", std::string(WireNames::SPNEGO)}},
      Tarvel::StringUtil::Base64Encode(leg));
}

} // namespace SsoClient
