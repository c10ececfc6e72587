// SPDX-License-Identifier: Apache-2.0

#include "compose/ws_security.h"

#include "compose/wire_names.h"
#include "model/namespaces.h"
#include "xml/date_time_text.h"
#include "xml/xml_text.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/document.h>

namespace SsoClient {

namespace {

std::string EncodeBase64(const Tarvel::Crypto::Certificate &certificate) {
  const auto &der = certificate.GetDer();
  std::string text(Tarvel::Base64_EncodedLength(der.size()), '\0');
  text.resize(Tarvel::Base64_Encode(der.data(), der.size(), text.data()));
  return text;
}

} // namespace

XMLCompositePtr WsSecurityHeaderBuilder(int minutes) {
  auto header = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wsse", "Security", {{"xmlns:wsse", std::string(Namespaces::WSSE)}}));
  header->Add(WssuTimestampBuilder(minutes));
  return header;
}

XMLCompositePtr WssuTimestampBuilder(int minutes) {
  const Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
  return WssuTimestampBuilder(now, AddMinutesToDate(now, minutes));
}

XMLCompositePtr WssuTimestampBuilder(const Tarvel::System::DateTime &created, const Tarvel::System::DateTime &expires) {
  auto timestamp = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wsu", "Timestamp", {{"xmlns:wsu", std::string(Namespaces::WSU)}}));
  timestamp->Add(TextElementBuilder("wsu", "Created", DateTimeFormatter(created)))
      .Add(TextElementBuilder("wsu", "Expires", DateTimeFormatter(expires)));
  return timestamp;
}

XMLCompositePtr WsseUsernameTokenBuilder(const std::string &user) {
  auto token = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wsse", "UsernameToken", {{"xmlns:wsse", std::string(Namespaces::WSSE)}}));
  token->Add(TextElementBuilder("wsse", "Username", user));
  return token;
}

XMLCompositePtr WsseUsernameTokenBuilder(const std::string &user, const std::string &password) {
  auto token = std::make_shared<XMLCompositeBuilder>(WsseUsernameTokenBuilder(user));
  token->Add(TextElementBuilder("wsse", "Password", {{"Type", std::string(WireNames::PASSWORD_TEXT)}}, password));
  return token;
}

XMLBuilderPtr WsseX509v3BinarySecTokenBuilder(const std::string &id, const Tarvel::Crypto::Certificate *certificate) {
  return TextElementBuilder("wsse", "BinarySecurityToken",
                            {{"EncodingType", std::string(WireNames::BASE64_BINARY)},
                             {"ValueType", std::string(WireNames::X509V3)},
                             {"wsu:Id", id},
                             {"xmlns:wsu", std::string(Namespaces::WSU)}},
                            EncodeBase64(*certificate));
}

XMLBuilderPtr WsseX509v3BSTReferenceBuilder(const std::string &id) {
  auto reference = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("wsse", "SecurityTokenReference", {{"xmlns:wsse", std::string(Namespaces::WSSE)}}));
  reference->Add(
      ElementBuilder("wsse", "Reference", {{"URI", "#" + id}, {"ValueType", std::string(WireNames::X509V3)}}));
  return reference;
}

XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(const std::string &assertionId, const ServiceDialect &dialect) {
  const std::string_view tokenType =
      dialect.standardTokenTypeReference ? WireNames::SAML_TOKEN_TYPE_AS_PUBLISHED : WireNames::SAML_TOKEN_TYPE;
  auto reference =
      std::make_shared<XMLCompositeBuilder>(ElementBuilder("wsse", "SecurityTokenReference",
                                                           {{"wsse11:TokenType", std::string(tokenType)},
                                                            {"xmlns:wsse", std::string(Namespaces::WSSE)},
                                                            {"xmlns:wsse11", std::string(Namespaces::WSSE11)}}));
  reference->Add(
      TextElementBuilder("wsse", "KeyIdentifier", {{"ValueType", std::string(WireNames::SAML_ID)}}, assertionId));
  return reference;
}

XMLBuilderPtr DsCertificateKeyInfoBuilder(const Tarvel::Crypto::Certificate &certificate) {
  auto data = std::make_shared<XMLCompositeBuilder>(ElementBuilder("ds", "X509Data"));
  data->Add(TextElementBuilder("ds", "X509Certificate", EncodeBase64(certificate)));
  auto keyInfo = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("ds", "KeyInfo", {{"xmlns:ds", std::string(Namespaces::DS)}}));
  keyInfo->Add(data);
  return keyInfo;
}

XMLBuilderPtr InsertSamlTokenBuilder(const SamlToken &token) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(token.ToXml(), document);
  return std::make_shared<const PreBuiltElementImpl>(
      Tarvel::Ref<Tarvel::Xml::ElementNode>(document->GetDocumentElement()));
}

} // namespace SsoClient
