// SPDX-License-Identifier: Apache-2.0

#include "exchange/soap_response.h"

#include "model/namespaces.h"
#include "xml/qualified_name.h"
#include "xml/xml_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/qname.h>

#include <algorithm>
#include <string>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::QName;
using Tarvel::Xml::TextNode;

struct AuthenticationFault {
  std::string_view namespaceUri;
  std::string_view localName;
};

/// The fault codes with which services refuse the caller's credentials in every dialect.
constexpr AuthenticationFault AUTHENTICATION_FAULTS[] = {
    {Namespaces::WST, "FailedAuthentication"},
    {Namespaces::WST, "InvalidSecurityToken"},
    {Namespaces::WSSE, "InvalidSecurityToken"},
};

template <typename Faults>
bool Contains(const Faults &faults, const QName &faultCode) {
  return std::any_of(std::begin(faults), std::end(faults), [&](const auto &fault) {
    return faultCode.namespaceUri == fault.namespaceUri && faultCode.localName == fault.localName;
  });
}

bool IsUtf8(std::string charset) {
  std::transform(charset.begin(), charset.end(), charset.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
  return charset == "utf-8" || charset == "utf8";
}

/// The declared charset, unless it is UTF-8. The message shows it, because the charset may be all that is wrong.
std::string DescribeCharset(const Tarvel::Reader &response) {
  const std::string charset = response.GetDeclaredCharset();
  return charset.empty() || IsUtf8(charset) ? "" : " (charset " + charset + ")";
}

} // namespace

Ref<const ElementNode> ParseResponseDocument(Tarvel::Reader &response) {
  Ref<const Document> document;
  try {
    Ref<Document> parsed;
    ParseXML(response, parsed);
    document = parsed;
  } catch (const Tarvel::Xml::XMLParseException &error) {
    throw SsoException(std::string("Response is not well-formed XML: ") + error.what() + DescribeCharset(response));
  }
  return Ref<const ElementNode>(document->GetDocumentElement());
}

void CheckSoapFault(const ElementNode &envelope, FaultListener *listener, const ServiceDialect &dialect) {
  const ElementNode *const fault = FindDescendant(&envelope, {"Body", "Fault"});
  if (!fault) {
    return;
  }
  if (listener) {
    listener->OnFault(*fault);
  }
  const ElementNode *const faultCode = fault->FindChildElement("faultcode");
  const TextNode *const codeText = GetTextNode(faultCode);
  if (!codeText) {
    throw SsoException("Invalid SOAP response: missing faultcode.");
  }
  QName name;
  ResolveQName(*faultCode, codeText->GetValue(), Namespaces::SOAPENV, name);
  const std::string faultString = GetText(GetTextNode(fault->FindChildElement("faultstring")));
  if (Contains(AUTHENTICATION_FAULTS, name) || Contains(dialect.credentialFaults, name)) {
    throw InvalidCredentialsException("Authentication failed" + (faultString.empty() ? "" : ": " + faultString));
  }
  throw SsoException("Unexpected SOAP fault: " + GetText(codeText) + "; request failed.");
}

const ElementNode *FindDescendant(const ElementNode *start,
                                  std::initializer_list<std::string_view> localNames) noexcept {
  const ElementNode *element = start;
  for (const std::string_view localName : localNames) {
    element = element ? element->FindChildElement(localName) : nullptr;
  }
  return element;
}

} // namespace SsoClient
