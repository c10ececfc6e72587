// SPDX-License-Identifier: Apache-2.0
/// @file
/// Responses of a token service, as text.

#pragma once

#include <string>

namespace Testing {

/// The text of a token file, without its XML declaration, so that it can be part of another document.
inline std::string WithoutXmlDeclaration(const std::string &xml) {
  const std::size_t end = xml.rfind("<?xml", 0) == 0 ? xml.find("?>") + 2 : 0;
  return xml.substr(xml.find('<', end));
}

/// An envelope around the content of its body. It binds soapenv, wst and wsse.
inline std::string Envelope(const std::string &content) {
  return R"(<?xml version="1.0" encoding="UTF-8"?>
<soapenv:Envelope xmlns:soapenv="http://schemas.xmlsoap.org/soap/envelope/")"
         R"( xmlns:wst="http://docs.oasis-open.org/ws-sx/ws-trust/200512")"
         R"( xmlns:wsse="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd">)"
         R"(<soapenv:Header/><soapenv:Body>)" +
         content + "</soapenv:Body></soapenv:Envelope>";
}

inline std::string Requested(const std::string &assertion) {
  return "<wst:RequestedSecurityToken>" + WithoutXmlDeclaration(assertion) + "</wst:RequestedSecurityToken>";
}

inline std::string Collection(const std::string &content) {
  return "<wst:RequestSecurityTokenResponseCollection>" + content + "</wst:RequestSecurityTokenResponseCollection>";
}

/// @param attributes for example " Context='c'"
inline std::string ResponseElement(const std::string &content, const std::string &attributes = "") {
  return "<wst:RequestSecurityTokenResponse" + attributes + ">" + content + "</wst:RequestSecurityTokenResponse>";
}

inline std::string IssueResponse(const std::string &assertion) {
  return Envelope(Collection(ResponseElement(Requested(assertion))));
}

inline std::string RenewResponse(const std::string &assertion) {
  return Envelope(ResponseElement(Requested(assertion)));
}

inline std::string ValidateResponse(const std::string &code) {
  return Envelope(ResponseElement("<wst:Status><wst:Code>" + code + "</wst:Code></wst:Status>"));
}

/// @param code as it is written in the fault, with its prefix
inline std::string FaultResponse(const std::string &code, const std::string &text) {
  return Envelope("<soapenv:Fault><faultcode>" + code + "</faultcode><faultstring>" + text +
                  "</faultstring></soapenv:Fault>");
}

/// @param exchange Base64
inline std::string IntermediateLeg(const std::string &context, const std::string &exchange) {
  return Envelope(
      ResponseElement("<wst:BinaryExchange>" + exchange + "</wst:BinaryExchange>", " Context='" + context + "'"));
}

inline std::string FinalLeg(const std::string &context, const std::string &exchange, const std::string &assertion) {
  return Envelope(Collection(ResponseElement("<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
                                             "<wst:BinaryExchange>" +
                                                 exchange + "</wst:BinaryExchange>" + Requested(assertion),
                                             " Context='" + context + "'")));
}

} // namespace Testing
