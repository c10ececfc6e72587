// SPDX-License-Identifier: Apache-2.0

#include "compose/ws_trust.h"

#include "compose/advice_elements.h"
#include "compose/wire_names.h"
#include "compose/ws_security.h"
#include "model/namespaces.h"
#include "xml/date_time_text.h"

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

} // namespace

XMLCompositePtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec) {
  const std::string keyType =
      confirmation == SamlToken::BEARER ? WstUris::KEY_TYPE_BEARER : WstUris::KEY_TYPE_PUBLIC_KEY;
  XMLCompositePtr request = RequestSecurityTokenBuilder(std::string(Namespaces::SAML), WstUris::ISSUE);
  request->Add(TextElementBuilder("wst", "KeyType", keyType))
      .Add(WssuLifetimeBuilder(spec.tokenLifetimeSec))
      .Add(WstRenewingBuilder(spec.renewable))
      .Add(TextElementBuilder("wst", "Delegatable", BooleanText(spec.delegable)));
  if (spec.delegateTo) {
    request->Add(WstDelegateToBuilder(*spec.delegateTo));
  }
  if (!spec.audienceRestriction.empty()) {
    request->Add(WstParticipantsBuilders(spec.audienceRestriction));
  }
  if (!spec.advice.empty()) {
    request->Add(RsaAdviceSetBuilder(spec.advice));
  }
  return request;
}

XMLCompositePtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec) {
  XMLCompositePtr request = CommonAcquireSecurityTokenBuilder(confirmation, spec);
  if (confirmation == SamlToken::HOLDER_OF_KEY) {
    request->Add(ElementBuilder("wst", "UseKey", {{"Sig", std::string(WireNames::HOLDER_OF_KEY_SIGNATURE_ID)}}));
  }
  return request;
}

XMLCompositePtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec) {
  return CommonAcquireSecurityTokenBuilder(confirmation, spec);
}

XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken &token, std::int64_t lifetimeSec) {
  XMLCompositePtr request = RequestSecurityTokenBuilder(std::string(Namespaces::SAML), WstUris::RENEW);
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

XMLBuilderPtr WstDelegateToBuilder(const std::string &name) {
  auto delegateTo = std::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", "DelegateTo"));
  delegateTo->Add(WsseUsernameTokenBuilder(name));
  return delegateTo;
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
