// SPDX-License-Identifier: Apache-2.0

#include "echo_message.h"

#include "xmlsec_oracle.h"

#include <stdexcept>

namespace DevStsTest {

namespace {

constexpr const char *SAML_PROFILE = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
constexpr const char *WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr const char *WSSE11 = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
constexpr const char *WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
constexpr const char *DS = "http://www.w3.org/2000/09/xmldsig#";
constexpr const char *EXCLUSIVE_C14N = "http://www.w3.org/2001/10/xml-exc-c14n#";

std::string Algorithm(const char *element, const char *uri) {
  return std::string("<ds:") + element + " Algorithm=\"" + uri + "\"/>";
}

std::string TimeFromNow(int seconds) {
  return Tarvel::System::GetUtcDateTime().PlusSeconds(seconds).ToString();
}

/// A signature without values.
std::string SignatureTemplate(const EchoMessage &message) {
  std::string text = std::string("<ds:Signature xmlns:ds=\"") + DS + "\"><ds:SignedInfo>" +
                     Algorithm("CanonicalizationMethod", EXCLUSIVE_C14N) +
                     Algorithm("SignatureMethod", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256");
  for (const std::string &id : message.references) {
    text += "<ds:Reference URI=\"#" + id + "\"><ds:Transforms>" + Algorithm("Transform", EXCLUSIVE_C14N) +
            "</ds:Transforms>" + Algorithm("DigestMethod", "http://www.w3.org/2001/04/xmlenc#sha256") +
            "<ds:DigestValue/></ds:Reference>";
  }
  return text + "</ds:SignedInfo><ds:SignatureValue/><ds:KeyInfo>" + message.keyInfo + "</ds:KeyInfo></ds:Signature>";
}

std::string WriteWith(const EchoMessage &message, const std::string &signature) {
  return "<s:Envelope xmlns:s=\"" + message.soap + "\"><s:Header>" + message.blocks + "<wsse:Security xmlns:wsse=\"" +
         WSSE + "\" xmlns:wsu=\"" + WSU + "\"" + message.securityAttributes + "><wsu:Timestamp wsu:Id=\"ts\">" +
         "<wsu:Created>" + message.created + "</wsu:Created><wsu:Expires>" + message.expires +
         "</wsu:Expires></wsu:Timestamp>" + signature + message.token + "</wsse:Security></s:Header>" +
         "<s:Body xmlns:wsu=\"" + WSU + "\" wsu:Id=\"body\">" + message.body + "</s:Body></s:Envelope>";
}

} // namespace

EchoMessage::EchoMessage(const SsoClient::SamlToken &presented)
    : token(presented.ToXml()), keyInfo(ReferenceToToken(presented.GetId(), SAML_PROFILE)) {
  SetPeriod(0, 300);
}

EchoMessage &EchoMessage::UseSoap12() {
  soap = "http://www.w3.org/2003/05/soap-envelope";
  contentType = "application/soap+xml; charset=utf-8";
  return *this;
}

EchoMessage &EchoMessage::SetPeriod(int createdIn, int expiresIn) {
  created = TimeFromNow(createdIn);
  expires = TimeFromNow(expiresIn);
  return *this;
}

std::string EchoMessage::Write() const {
  return WriteWith(*this, {});
}

std::string EchoMessage::Sign(const Testing::DevSts &service, const std::string &identity) const {
  const Testing::XmlDocHandle document = Testing::ParseWithLibxml2(WriteWith(*this, SignatureTemplate(*this)));
  const Testing::XmlSecKeyHandle key = Testing::LoadXmlSecKey(service.PathOf(identity + ".key"));
  if (!document || !Testing::SignWithXmlSec(*document, *key)) {
    throw std::runtime_error("xmlsec1 does not sign the message");
  }
  return Testing::Serialise(*document);
}

std::string ReferenceToToken(const std::string &id, const std::string &tokenType) {
  return std::string("<wsse:SecurityTokenReference xmlns:wsse11=\"") + WSSE11 + "\" wsse11:TokenType=\"" + tokenType +
         "\"><wsse:KeyIdentifier "
         "ValueType=\"http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID\">" +
         id + "</wsse:KeyIdentifier></wsse:SecurityTokenReference>";
}

HttpAnswer SendToEcho(const Testing::DevSts &service, const EchoMessage &message, const std::string &text) {
  return Post(service, "", text, "/echo", message.contentType);
}

std::string EchoOf(const EchoMessage &message, const SsoClient::SamlToken &token, const std::string &subject,
                   const std::string &proof) {
  return "<s:Envelope xmlns:s=\"" + message.soap +
         "\"><s:Header><echo:Proven xmlns:echo=\"https://localhost/echo\"><echo:Subject>" + subject +
         "</echo:Subject><echo:Token>" + token.GetId() + "</echo:Token><echo:Proof>" + proof +
         "</echo:Proof></echo:Proven></s:Header><s:Body xmlns:wsu=\"" + WSU + "\">" + message.body +
         "</s:Body></s:Envelope>";
}

} // namespace DevStsTest
