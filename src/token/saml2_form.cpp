// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_form.h"

#include "token/saml2_model.h"
#include "xml/expected_element.h"
#include "xml/form_text.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <algorithm>
#include <optional>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;

/// Every element of a document with a schema may have these (XML Schema, part 1, section 2.6).
bool IsSchemaAttribute(const QNameView &name) {
  return name.namespaceUri == Namespaces::XSI && (name.localName == "type" || name.localName == "schemaLocation" ||
                                                  name.localName == "noNamespaceSchemaLocation");
}

bool IsForeignAttribute(const QNameView &name) {
  return IsSchemaAttribute(name) ||
         (!name.namespaceUri.empty() && name.namespaceUri != Namespaces::SAML && name.namespaceUri != Namespaces::XSI);
}

void RequireSchemaType(const ElementNode &element, std::initializer_list<QNameView> types, DeviationSink &sink) {
  const Attribute *const attribute = element.FindAttribute(XSI_TYPE.namespaceUri, XSI_TYPE.localName);
  const std::optional<QNameView> found = attribute ? ResolveXsiType(element, *attribute, sink) : std::nullopt;
  if (found && std::find(types.begin(), types.end(), *found) == types.end()) {
    Refuse(sink, {element, attribute->GetName()}, *types.begin(), attribute->GetValue(),
           "Unexpected type of element '%1': '%2'", element.GetName(), *found);
  }
}

bool IsEncrypted(const NodeFilterIterator &iterator) {
  return IsSamlElement(iterator, "EncryptedID") || IsSamlElement(iterator, "EncryptedAttribute") ||
         IsSamlElement(iterator, "EncryptedAssertion");
}

} // namespace

void RequireSchemaAttributes(const ElementNode &element, std::initializer_list<QNameView> types,
                             std::initializer_list<QNameView> required, std::initializer_list<QNameView> optional,
                             DeviationSink &sink, ForeignAttributes foreign) {
  RequireElementAttributesQNames(element, required, optional, sink,
                                 foreign == ForeignAttributes::IGNORED ? IsForeignAttribute : IsSchemaAttribute);
  RequireSchemaType(element, types, sink);
}

boost::optional<std::string> ReadOptionalText(const ElementNode &element, std::string_view name) {
  const Attribute *const attribute = element.FindAttribute(std::string_view(), name);
  return attribute ? boost::make_optional(std::string(attribute->GetValue())) : boost::none;
}

boost::optional<DateTime> ReadOptionalDate(const ElementNode &element, std::string_view name, DeviationSink &sink) {
  DateTime date;
  return GetDateAttribute(element, name, date, sink) ? boost::make_optional(date) : boost::none;
}

bool ParseUriElement(NodeFilterIterator &iterator, std::string_view localName, std::string &uri, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, localName, Namespaces::SAML, sink);
  if (!taken.node) {
    return false;
  }
  RequireSchemaAttributes(*IteratorToElement(taken), {ANY_URI_TYPE}, {}, {}, sink);
  return RequireTextualContent(taken, uri, sink);
}

bool IsSamlElement(const NodeFilterIterator &iterator, std::string_view localName) noexcept {
  return ElementQNameIs(IteratorToElement(iterator), localName, Namespaces::SAML);
}

bool TryRefuseUnsupported(NodeFilterIterator &iterator, DeviationSink &sink) {
  const bool isEncrypted = IsEncrypted(iterator);
  if (!isEncrypted && !IsSamlElement(iterator, "BaseID")) {
    return false;
  }
  Refuse(sink, iterator, isEncrypted ? "content that is not encrypted" : "element saml:NameID", WhatIsAt{iterator.node},
         isEncrypted ? "Encrypted content is not supported: '%1'" : "An identifier of this kind is not supported: '%1'",
         IteratorToElement(iterator)->GetName());
  iterator.MoveToSibling();
  return true;
}

void RefuseContent(NodeFilterIterator &iterator, std::string_view allowed, DeviationSink &sink) {
  const WhatIsAt found{iterator.node};
  const ElementNode *const parent = Tarvel::Xml::AsElement(iterator.parent);
  Refuse(sink, iterator, allowed, found, "Unexpected content of element '%1': %2",
         parent ? parent->GetName() : std::string_view(), found);
  iterator.MoveToSibling();
}

void RefuseFurtherContent(NodeFilterIterator iterator, DeviationSink &sink) {
  while (iterator.node) {
    RefuseContent(iterator, "no further element", sink);
  }
}

void RefuseRepeated(NodeFilterIterator &iterator, DeviationSink &sink) {
  Refuse(sink, iterator, "at most one", WhatIsAt{iterator.node}, "Repeated element: '%1'",
         IteratorToElement(iterator)->GetName());
  iterator.MoveToSibling();
}

bool RequireRoomForElement(const NodeFilterIterator &iterator, std::size_t count, DeviationSink &sink) {
  if (count < MAX_REPEATED_ELEMENTS) {
    return true;
  }
  Refuse(sink, iterator, MAX_REPEATED_ELEMENTS, WhatIsAt{iterator.node}, "More than %1 elements '%2'",
         MAX_REPEATED_ELEMENTS, IteratorToElement(iterator)->GetName());
  return false;
}

} // namespace SsoClient
