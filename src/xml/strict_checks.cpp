// SPDX-License-Identifier: Apache-2.0

#include "xml/strict_checks.h"

#include "xml/form_text.h"
#include "xml/refuse.h"

#include <tarvel/core/string_util.h>

#include <boost/lexical_cast.hpp>

#include <algorithm>
#include <optional>

namespace SsoClient {

namespace {

using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;

constexpr std::string_view DEFAULT_DECLARATION = "xmlns";
constexpr std::string_view PREFIX_DECLARATION = "xmlns:";
constexpr std::string_view DIGITS = "0123456789";

template <typename Name>
void RefuseMissingAttribute(DeviationSink &sink, const ElementNode &element, const Place &place,
                            const AttributesOfNames<Name> &allowed, const Name &name) {
  // The missing apostrophe after the name of the element is part of the established form of the message.
  Refuse(sink, place, allowed, "", "Node '%1 is missing required attribute '%2'", element.GetName(), name);
}

std::string_view NameOf(const ElementNode *element) {
  return element ? element->GetName() : std::string_view();
}

/// The element's qualified name, which does not depend on the prefix; without a namespace if the prefix is not bound.
QNameView QNameOf(const ElementNode &element) {
  std::string_view namespaceUri;
  element.LookupNamespace(element.GetPrefix(), namespaceUri);
  return {namespaceUri, element.GetLocalName()};
}

bool IsDeclaration(std::string_view attributeName) {
  return attributeName == DEFAULT_DECLARATION ||
         attributeName.substr(0, PREFIX_DECLARATION.size()) == PREFIX_DECLARATION;
}

template <typename Names, typename Name>
bool Contains(const Names &names, const Name &name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

bool ReadDate(const ElementNode &element, std::string_view name, std::string_view text, Tarvel::System::DateTime &date,
              DeviationSink &sink) {
  if (Tarvel::System::DateTime::TryParse(text, date)) {
    return true;
  }
  Refuse(sink, {element, name}, "a date of the form xsd:dateTime", text, "%1/@%2 is not a date", element.GetName(),
         name);
  return false;
}

bool HasAttributeWritten(const ElementNode &element, std::string_view name) {
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (attribute->GetName() == name) {
      return true;
    }
  }
  return false;
}

} // namespace

const ElementNode &RequireElementQName(const ElementNode *element, std::string_view localName,
                                       std::string_view namespaceUri) {
  RequireElementQName(NodeFilterIterator(element, nullptr), localName, namespaceUri, ThrowingSink());
  return *element;
}

bool RequireElementQName(const NodeFilterIterator &iterator, std::string_view localName, std::string_view namespaceUri,
                         DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  if (ElementQNameIs(element, localName, namespaceUri)) {
    return true;
  }
  const ElementOfName allowed{{namespaceUri, localName}};
  if (element && element->GetLocalName() == localName) {
    Refuse(sink, *element, allowed, ElementOfName{QNameOf(*element)}, "Element '%1' has unexpected namespace",
           element->GetName());
  } else {
    Refuse(sink, iterator, allowed, WhatIsAt{iterator.node}, "Expected element '%1' not found.", localName);
  }
  return false;
}

void RequireEmptyElement(NodeFilterIterator iterator, DeviationSink &sink) {
  if (const Tarvel::Xml::Node *const content = iterator.GetChild().node) {
    Refuse(sink, iterator, "no content", WhatIsAt{content}, "Element '%1' must be empty",
           NameOf(IteratorToElement(iterator)));
  }
}

void RequireNoFurtherNode(NodeFilterIterator iterator, const char *message, DeviationSink &sink) {
  for (; iterator.node; iterator.MoveToSibling()) {
    RefuseFurtherNode(iterator, message, sink);
  }
}

void RefuseFurtherNode(const NodeFilterIterator &iterator, const char *message, DeviationSink &sink) {
  Refuse(sink, iterator, "no further element", WhatIsAt{iterator.node}, "%1", message);
}

void RequireNoAttributes(const ElementNode &element, DeviationSink &sink) {
  RequireElementAttributesNames(element, {}, {}, sink);
}

void RequireElementAttributesNames(const ElementNode &element, std::initializer_list<std::string_view> required,
                                   std::initializer_list<std::string_view> optional, DeviationSink &sink) {
  const AttributesOfNames<std::string_view> allowed{required, optional};
  // There are few known names, so a scan for each of them is faster than a set, and linear in the number of attributes.
  for (const std::string_view name : required) {
    if (!HasAttributeWritten(element, name)) {
      RefuseMissingAttribute(sink, element, {element, name}, allowed, name);
    }
  }
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    const std::string_view name = attribute->GetName();
    if (!Contains(required, name) && !Contains(optional, name) && !IsDeclaration(name)) {
      Refuse(sink, {element, name}, allowed, attribute->GetValue(), "Unexpected attributes on element '%1'",
             element.GetName());
    }
  }
}

void RequireElementAttributesQNames(const ElementNode &element, std::initializer_list<QNameView> required,
                                    std::initializer_list<QNameView> optional, DeviationSink &sink,
                                    bool (*isIgnored)(const QNameView &name)) {
  const AttributesOfNames<QNameView> allowed{required, optional};
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    const std::string_view written = attribute->GetName();
    if (IsDeclaration(written)) {
      continue;
    }
    const std::optional<QNameView> name = ResolveQName(element, written, written, std::string_view(), sink);
    if (name && !Contains(required, *name) && !Contains(optional, *name) && !(isIgnored && isIgnored(*name))) {
      Refuse(sink, {element, written}, allowed, attribute->GetValue(), "Unexpected attribute '%1' on element '%2'",
             *name, element.GetName());
    }
  }
  for (const QNameView &name : required) {
    if (!element.FindAttribute(name.namespaceUri, name.localName)) {
      RefuseMissingAttribute(sink, element, {element, name.localName}, allowed, name);
    }
  }
}

bool RequireTextualContent(const NodeFilterIterator &iterator, std::string &text, DeviationSink &sink) {
  const ElementNode *const element = IteratorToElement(iterator);
  NodeFilterIterator content = iterator.GetChild();
  const Tarvel::Xml::TextNode *const textNode = Tarvel::Xml::AsText(content.node);
  if (!textNode || content.MoveToSibling().node) {
    Refuse(sink, iterator, "one text", WhatIsAt{content.node},
           "Element '%1' must only have textual content (but has extra children or is empty).", NameOf(element));
    return false;
  }
  text = textNode->GetValue();
  return true;
}

std::string_view GetTextAttribute(const ElementNode &element, std::string_view name) noexcept {
  const Attribute *const attribute = element.FindAttribute(std::string_view(), name);
  return attribute ? attribute->GetValue() : std::string_view();
}

void GetDateAttribute(const ElementNode &element, std::string_view name, Tarvel::System::DateTime &date) {
  ReadDate(element, name, GetTextAttribute(element, name), date, ThrowingSink());
}

bool GetDateAttribute(const ElementNode &element, std::string_view name, Tarvel::System::DateTime &date,
                      DeviationSink &sink) {
  const Attribute *const attribute = element.FindAttribute(std::string_view(), name);
  return attribute && ReadDate(element, name, attribute->GetValue(), date, sink);
}

void GetBoolAttribute(const ElementNode &element, std::string_view name, bool &flag, DeviationSink &sink) {
  const std::string_view written = GetTextAttribute(element, name);
  const std::string text = Tarvel::StringUtil::ToLower(written);
  const bool isTrue = text == "1" || text == "true";
  if (!isTrue && text != "0" && text != "false") {
    Refuse(sink, {element, name}, "true, 1, false or 0", written, "%1/@%2 is not a Boolean", element.GetName(), name);
    return;
  }
  flag = isTrue;
}

void GetULongOptionalAttribute(const ElementNode &element, std::string_view name,
                               boost::optional<std::uint64_t> &number, DeviationSink &sink) {
  const Attribute *const attribute = element.FindAttribute(std::string_view(), name);
  if (!attribute) {
    number = boost::none;
    return;
  }
  const std::string_view text = attribute->GetValue();
  std::uint64_t value = 0;
  // Signs and digit grouping are refused first: the conversion would read "-1" as a number near 2^64.
  if (text.find_first_not_of(DIGITS) != std::string_view::npos ||
      !boost::conversion::try_lexical_convert(text.data(), text.size(), value)) {
    Refuse(sink, {element, name}, "a non-negative integer", text, "%1/@%2 is not a non-negative integer.",
           element.GetName(), name);
    return;
  }
  number = value;
}

} // namespace SsoClient
