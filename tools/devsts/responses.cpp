// SPDX-License-Identifier: Apache-2.0

#include "responses.h"

#include "base64.h"

#include <new>

namespace DevSts {

namespace {

/// An envelope with an empty body.
Document NewEnvelope() {
  Document document = NewDocument(Ns::SOAPENV, "Envelope");
  AddElement(*xmlDocGetRootElement(document.get()), Ns::SOAPENV, "Body");
  return document;
}

xmlNode &BodyOf(xmlDoc &envelope) {
  return *ChildElements(*xmlDocGetRootElement(&envelope)).front();
}

xmlNode &AddTokenResponse(xmlNode &parent, const xmlDoc &token, const std::string &tokenType) {
  xmlNode &response = AddElement(parent, Ns::WST, "RequestSecurityTokenResponse");
  AddElement(response, Ns::WST, "TokenType", tokenType);
  xmlNode &requested = AddElement(response, Ns::WST, "RequestedSecurityToken");
  xmlNode *const copy = xmlDocCopyNode(xmlDocGetRootElement(&token), parent.doc, 1);
  if (!copy) {
    throw std::bad_alloc();
  }
  xmlAddChild(&requested, copy);
  return response;
}

void AddLeg(xmlNode &response, const std::string &context, const std::vector<unsigned char> &leg) {
  SetAttribute(response, "Context", context);
  if (leg.empty()) {
    return;
  }
  xmlNode &exchange = AddElement(response, Ns::WST, "BinaryExchange", EncodeBase64(leg));
  SetAttribute(exchange, "EncodingType", BASE64_ENCODING);
  SetAttribute(exchange, "ValueType", SPNEGO_VALUE_TYPE);
}

} // namespace

Document IssueResponse(const xmlDoc &token, const std::string &tokenType) {
  Document document = NewEnvelope();
  AddTokenResponse(AddElement(BodyOf(*document), Ns::WST, "RequestSecurityTokenResponseCollection"), token, tokenType);
  return document;
}

Document LegResponse(const std::string &context, const std::vector<unsigned char> &leg) {
  Document document = NewEnvelope();
  AddLeg(AddElement(BodyOf(*document), Ns::WST, "RequestSecurityTokenResponse"), context, leg);
  return document;
}

Document NegotiatedResponse(const std::string &context, const std::vector<unsigned char> &leg, const xmlDoc &token,
                            const std::string &tokenType) {
  Document document = NewEnvelope();
  xmlNode &collection = AddElement(BodyOf(*document), Ns::WST, "RequestSecurityTokenResponseCollection");
  AddLeg(AddTokenResponse(collection, token, tokenType), context, leg);
  return document;
}

Document RenewResponse(const xmlDoc &token, const std::string &tokenType) {
  Document document = NewEnvelope();
  AddTokenResponse(BodyOf(*document), token, tokenType);
  return document;
}

Document ValidateResponse(bool isValid) {
  Document document = NewEnvelope();
  xmlNode &response = AddElement(BodyOf(*document), Ns::WST, "RequestSecurityTokenResponse");
  AddElement(response, Ns::WST, "TokenType", std::string(Ns::WST.uri) + "/RSTR/Status");
  xmlNode &status = AddElement(response, Ns::WST, "Status");
  AddElement(status, Ns::WST, "Code", std::string(Ns::WST.uri) + (isValid ? "/status/valid" : "/status/invalid"));
  return document;
}

Document FaultResponse(const FaultCode *code, const std::string &reason) {
  Document document = NewEnvelope();
  xmlNode &fault = AddElement(BodyOf(*document), Ns::SOAPENV, "Fault");
  // In SOAP 1.1 the children of a fault have no namespace. The code is a qualified name, so its prefix must be
  // declared.
  const auto add = [&fault](const char *name, const std::string &text) -> xmlNode & {
    xmlNode &element = AddElement(fault, Ns::SOAPENV, name, text);
    xmlSetNs(&element, nullptr);
    return element;
  };
  if (code) {
    xmlNode &element = add("faultcode", std::string(code->ns.prefix) + ":" + code->name);
    DeclareNamespace(element, code->ns);
  }
  add("faultstring", reason);
  return document;
}

} // namespace DevSts
