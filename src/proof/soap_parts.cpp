// SPDX-License-Identifier: Apache-2.0

#include "proof/soap_parts.h"

#include "model/namespaces.h"

#include <iterator>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::AsText;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

constexpr std::string_view WHITE_SPACE = " \t\r\n";
constexpr std::string_view ULTIMATE_RECEIVER = "http://www.w3.org/2003/05/soap-envelope/role/ultimateReceiver";

/// Sets `found` to the version with that namespace. Returns whether there is one.
bool FindVersion(std::string_view namespaceUri, SoapVersion &found) noexcept {
  for (const SoapVersion version : {SoapVersion::SOAP11, SoapVersion::SOAP12}) {
    if (namespaceUri == GetSoapNamespace(version)) {
      found = version;
      return true;
    }
  }
  return false;
}

/// Reads one child of the envelope. Returns what is wrong with it.
EnvelopeFault ReadChild(const Node &child, SoapEnvelope &envelope) noexcept {
  if (const auto *const text = AsText(&child)) {
    const bool isBlank = text->GetValue().find_first_not_of(WHITE_SPACE) == std::string_view::npos;
    return isBlank ? EnvelopeFault::NONE : EnvelopeFault::OTHER_CONTENT;
  }
  const ElementNode *const element = AsElement(&child);
  if (!element) { // a comment or a processing instruction
    return EnvelopeFault::NONE;
  }
  const std::string_view soap = GetSoapNamespace(envelope.version);
  if (element->HasQName(soap, "Header")) {
    const bool isSecond = envelope.header;
    envelope.header = isSecond ? envelope.header : element;
    return isSecond ? EnvelopeFault::SECOND_HEADER
                    : (envelope.body ? EnvelopeFault::HEADER_AFTER_BODY : EnvelopeFault::NONE);
  }
  if (!element->HasQName(soap, "Body")) {
    return EnvelopeFault::OTHER_CONTENT;
  }
  const bool isSecond = envelope.body;
  envelope.body = isSecond ? envelope.body : element;
  return isSecond ? EnvelopeFault::SECOND_BODY : EnvelopeFault::NONE;
}

void NoteFault(SoapEnvelope &envelope, EnvelopeFault fault, const Node *place) noexcept {
  if (envelope.fault == EnvelopeFault::NONE && fault != EnvelopeFault::NONE) {
    envelope.fault = fault;
    envelope.place = place;
  }
}

/// Returns whether the search can end, because there are two elements.
bool Add(FoundElements &found, const ElementNode *element) noexcept {
  (found.first ? found.second : found.first) = element;
  return found.second;
}

} // namespace

std::string_view GetSoapNamespace(SoapVersion version) noexcept {
  return version == SoapVersion::SOAP11 ? Namespaces::SOAPENV : Namespaces::SOAP12;
}

SoapEnvelope ReadEnvelope(const ElementNode *element) noexcept {
  SoapEnvelope envelope;
  envelope.element = element;
  if (!element || element->GetLocalName() != "Envelope") {
    NoteFault(envelope, EnvelopeFault::NOT_AN_ENVELOPE, element);
    return envelope;
  }
  std::string_view namespaceUri;
  element->LookupNamespace(element->GetPrefix(), namespaceUri);
  if (!FindVersion(namespaceUri, envelope.version)) {
    NoteFault(envelope, EnvelopeFault::OTHER_VERSION, element);
    return envelope;
  }
  for (const Node *child = element->GetFirstChild(); child; child = child->GetNextSibling()) {
    NoteFault(envelope, ReadChild(*child, envelope), child);
  }
  if (!envelope.body) {
    NoteFault(envelope, EnvelopeFault::NO_BODY, element);
  }
  return envelope;
}

FoundElements FindChildren(const ElementNode *parent, std::string_view namespaceUri,
                           std::string_view localName) noexcept {
  FoundElements found;
  for (const Node *node = parent ? parent->GetFirstChild() : nullptr; node; node = node->GetNextSibling()) {
    const ElementNode *const element = AsElement(node);
    if (element && element->HasQName(namespaceUri, localName) && Add(found, element)) {
      break;
    }
  }
  return found;
}

FoundElements FindHeaderBlocks(const SoapEnvelope &envelope, const MessagePart &part) noexcept {
  return FindChildren(envelope.header, part.namespaceUri, part.localName);
}

FoundElements FindSecurityHeaders(const SoapEnvelope &envelope, std::string_view role) noexcept {
  const std::string_view wanted = NormaliseRole(role, envelope.version);
  FoundElements found;
  for (const Node *node = envelope.header ? envelope.header->GetFirstChild() : nullptr; node;
       node = node->GetNextSibling()) {
    const ElementNode *const element = AsElement(node);
    if (element && element->HasQName(Namespaces::WSSE, "Security") && GetRole(*element, envelope.version) == wanted &&
        Add(found, element)) {
      break;
    }
  }
  return found;
}

std::string_view GetRole(const ElementNode &block, SoapVersion version) noexcept {
  const Attribute *const attribute =
      block.FindAttribute(GetSoapNamespace(version), version == SoapVersion::SOAP11 ? "actor" : "role");
  return attribute ? NormaliseRole(attribute->GetValue(), version) : std::string_view();
}

std::string_view NormaliseRole(std::string_view role, SoapVersion version) noexcept {
  const std::size_t begin = role.find_first_not_of(WHITE_SPACE);
  if (begin == std::string_view::npos) {
    return {};
  }
  const std::string_view trimmed = role.substr(begin, role.find_last_not_of(WHITE_SPACE) + 1 - begin);
  return version == SoapVersion::SOAP12 && trimmed == ULTIMATE_RECEIVER ? std::string_view() : trimmed;
}

const Attribute *FindIdentifier(const ElementNode &element) noexcept {
  const Attribute *const candidates[] = {element.FindAttribute(Namespaces::WSU, "Id"),
                                         element.FindAttribute(std::string_view(), "Id"),
                                         element.FindAttribute(std::string_view(), "ID"),
                                         element.FindAttribute("http://www.w3.org/XML/1998/namespace", "id")};
  for (const Attribute *const candidate : candidates) {
    // A reference to an empty identifier, or to one with a parenthesis, which may be an XPointer, is refused everywhere.
    if (candidate && !candidate->GetValue().empty() && candidate->GetValue().find('(') == std::string_view::npos) {
      return candidate;
    }
  }
  return nullptr;
}

bool IsIdentifier(const Attribute &attribute, const ElementNode &element) noexcept {
  const std::string_view name = attribute.GetName();
  if (name == "Id" || name == "ID" || name == "xml:id") {
    return true;
  }
  std::string_view uri;
  return attribute.GetLocalName() == "Id" && !attribute.IsNamespaceDeclaration() &&
         element.LookupNamespace(attribute.GetPrefix(), uri) && uri == Namespaces::WSU;
}

} // namespace SsoClient
