// SPDX-License-Identifier: Apache-2.0

#include "responses.h"

#include "base64.h"

#include <new>
#include <string_view>
#include <utility>

namespace DevSts {

namespace {

/// An envelope with an empty body.
Document NewEnvelope(const Namespace &soap = Ns::SOAPENV) {
  Document document = NewDocument(soap, "Envelope");
  AddElement(*xmlDocGetRootElement(document.get()), soap, "Body");
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

bool IsOfSoap(const FaultCode &code) {
  return std::string_view(code.ns.uri) == Ns::SOAPENV.uri;
}

/// The code of SOAP 1.2 for a code of SOAP 1.1, or of another standard.
const char *Soap12Code(const FaultCode &code) {
  const std::string name = IsOfSoap(code) ? code.name : "";
  if (name == Code::MUST_UNDERSTAND.name) {
    return Code::MUST_UNDERSTAND.name;
  }
  return name == Code::SERVER.name ? "Receiver" : "Sender";
}

Document Soap12FaultResponse(const FaultCode &code, const std::string &reason) {
  Document document = NewEnvelope(Ns::SOAP12);
  xmlNode &fault = AddElement(BodyOf(*document), Ns::SOAP12, "Fault");
  xmlNode &outer = AddElement(fault, Ns::SOAP12, "Code");
  AddElement(outer, Ns::SOAP12, "Value", std::string(Ns::SOAP12.prefix) + ":" + Soap12Code(code));
  if (!IsOfSoap(code)) {
    xmlNode &subcode = AddElement(outer, Ns::SOAP12, "Subcode");
    DeclareNamespace(AddElement(subcode, Ns::SOAP12, "Value", std::string(code.ns.prefix) + ":" + code.name), code.ns);
  }
  xmlNode &text = AddElement(AddElement(fault, Ns::SOAP12, "Reason"), Ns::SOAP12, "Text", reason);
  xmlNodeSetLang(&text, XmlText("en"));
  return document;
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

bool IsFaultOfSender(const FaultCode &code) {
  return !IsOfSoap(code) || code.name == std::string(Code::CLIENT.name);
}

Document VersionedFaultResponse(const SoapVersion &version, const FaultCode &code, const std::string &reason) {
  return version == SOAP_1_2 ? Soap12FaultResponse(code, reason) : FaultResponse(&code, reason);
}

Document EchoResponse(ProvenMessage message) {
  SetText(*message.header, {}); // removes the header blocks
  xmlFreePropList(message.body->properties);
  message.body->properties = nullptr;
  xmlNode &proven = AddElement(*message.header, Ns::ECHO, "Proven");
  AddElement(proven, Ns::ECHO, "Subject", message.token.subject);
  AddElement(proven, Ns::ECHO, "Token", message.tokenId);
  AddElement(proven, Ns::ECHO, "Proof", ProofName(message.proof));
  return std::move(message.document);
}

} // namespace DevSts
