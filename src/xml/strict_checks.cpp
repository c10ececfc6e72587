// SPDX-License-Identifier: Apache-2.0

#include "xml/strict_checks.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>

#include <boost/lexical_cast.hpp>

#include <algorithm>

namespace SsoClient {

namespace {

using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;

constexpr std::string_view DEFAULT_DECLARATION = "xmlns";
constexpr std::string_view PREFIX_DECLARATION = "xmlns:";
constexpr std::string_view DIGITS = "0123456789";

template <typename... Args>
[[noreturn]] void Refuse(std::string_view format, const Args &...args) {
  throw ParseException(Tarvel::MessageFormatter::ASPrint(format, args...));
}

[[noreturn]] void RefuseMissingAttribute(const ElementNode &element, std::string_view name) {
  // The missing apostrophe after the name of the element is part of the established form of the message.
  Refuse("Node '%1 is missing required attribute '%2'", element.GetName(), name);
}

std::string_view NameOf(const ElementNode *element) {
  return element ? element->GetName() : std::string_view();
}

bool IsDeclaration(std::string_view attributeName) {
  return attributeName == DEFAULT_DECLARATION ||
         attributeName.substr(0, PREFIX_DECLARATION.size()) == PREFIX_DECLARATION;
}

template <typename Names, typename Name>
bool Contains(const Names &names, const Name &name) {
  return std::find(names.begin(), names.end(), name) != names.end();
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
  if (ElementQNameIs(element, localName, namespaceUri)) {
    return *element;
  }
  if (!element || element->GetLocalName() != localName) {
    Refuse("Expected element '%1' not found.", localName);
  }
  Refuse("Element '%1' has unexpected namespace", element->GetName());
}

void RequireEmptyElement(NodeFilterIterator iterator) {
  if (iterator.GetChild().node) {
    Refuse("Element '%1' must be empty", NameOf(IteratorToElement(iterator)));
  }
}

void RequireNoFurtherNode(const NodeFilterIterator &iterator, const char *message) {
  if (iterator.node) {
    throw ParseException(message);
  }
}

void RequireNoAttributes(const ElementNode &element) {
  RequireElementAttributesNames(element, {}, {});
}

void RequireElementAttributesNames(const ElementNode &element, std::initializer_list<std::string_view> required,
                                   std::initializer_list<std::string_view> optional) {
  // There are few known names, so a scan for each of them is faster than a set, and linear in the number of attributes.
  for (const std::string_view name : required) {
    if (!HasAttributeWritten(element, name)) {
      RefuseMissingAttribute(element, name);
    }
  }
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    const std::string_view name = attribute->GetName();
    if (!Contains(required, name) && !Contains(optional, name) && !IsDeclaration(name)) {
      Refuse("Unexpected attributes on element '%1'", element.GetName());
    }
  }
}

void RequireElementAttributesQNames(const ElementNode &element, std::initializer_list<QNameView> required,
                                    std::initializer_list<QNameView> optional) {
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (IsDeclaration(attribute->GetName())) {
      continue;
    }
    const QNameView name = ResolveQName(element, attribute->GetName(), std::string_view());
    if (!Contains(required, name) && !Contains(optional, name)) {
      Refuse("Unexpected attribute '%1' on element '%2'", name.ToString(), element.GetName());
    }
  }
  for (const QNameView &name : required) {
    if (!element.FindAttribute(name.namespaceUri, name.localName)) {
      RefuseMissingAttribute(element, name.ToString());
    }
  }
}

void RequireTextualContent(NodeFilterIterator iterator, std::string &text) {
  const ElementNode *const element = IteratorToElement(iterator);
  const Tarvel::Xml::TextNode *const textNode = Tarvel::Xml::AsText(iterator.MoveToChild().node);
  if (!textNode || iterator.MoveToSibling().node) {
    Refuse("Element '%1' must only have textual content (but has extra children or is empty).", NameOf(element));
  }
  text = textNode->GetValue();
}

std::string_view GetTextAttribute(const ElementNode &element, std::string_view name) noexcept {
  const Attribute *const attribute = element.FindAttribute(std::string_view(), name);
  return attribute ? attribute->GetValue() : std::string_view();
}

void GetDateAttribute(const ElementNode &element, std::string_view name, Tarvel::System::DateTime &date) {
  try {
    date = Tarvel::System::DateTime(GetTextAttribute(element, name));
  } catch (const Tarvel::DateTimeFormatException &) {
    Refuse("%1/@%2 is not a date", element.GetName(), name);
  }
}

void GetBoolAttribute(const ElementNode &element, std::string_view name, bool &flag) {
  const std::string text = Tarvel::StringUtil::ToLower(GetTextAttribute(element, name));
  const bool isTrue = text == "1" || text == "true";
  if (!isTrue && text != "0" && text != "false") {
    Refuse("%1/@%2 is not a Boolean", element.GetName(), name);
  }
  flag = isTrue;
}

void GetULongOptionalAttribute(const ElementNode &element, std::string_view name,
                               boost::optional<std::uint64_t> &number) {
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
    Refuse("%1/@%2 is not a non-negative integer.", element.GetName(), name);
  }
  number = value;
}

} // namespace SsoClient
