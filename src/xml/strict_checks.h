// SPDX-License-Identifier: Apache-2.0
/// @file
/// The checks with which the assertion parser refuses whatever it does not know.
///
/// Each returns normally or throws a `ParseException` that names the element, and then has changed nothing. They see
/// elements through the cursor: comments and white space between nodes do not count.

#pragma once

#include "xml/node_filter_iterator.h"
#include "xml/qualified_name.h"

#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>

namespace SsoClient {

/// `element` must be there and have that name. Returns it.
const Tarvel::Xml::ElementNode &RequireElementQName(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                                                    std::string_view namespaceUri);

/// The element that the cursor stands on must have no content.
void RequireEmptyElement(NodeFilterIterator iterator);

/// The cursor must be off the end; `message` says what is refused otherwise.
void RequireNoFurtherNode(const NodeFilterIterator &iterator, const char *message);

/// `element` must have no attributes but namespace declarations.
void RequireNoAttributes(const Tarvel::Xml::ElementNode &element);

/// `element` must have all the required attributes, may have the optional ones, and no others but namespace
/// declarations. The names are compared as they are written.
void RequireElementAttributesNames(const Tarvel::Xml::ElementNode &element,
                                   std::initializer_list<std::string_view> required,
                                   std::initializer_list<std::string_view> optional);

/// The same for attributes that are told apart by qualified name.
void RequireElementAttributesQNames(const Tarvel::Xml::ElementNode &element, std::initializer_list<QNameView> required,
                                    std::initializer_list<QNameView> optional);

/// The element that the cursor stands on must hold one text and nothing else. Two texts with a comment between them are
/// two: a comment cannot cut a value short. It can only cut off white space at either end, which alone is no text here.
void RequireTextualContent(NodeFilterIterator iterator, std::string &text);

/// The value of an attribute without a prefix; empty when it is not there.
std::string_view GetTextAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name) noexcept;

/// Reads an attribute in the form xsd:dateTime.
void GetDateAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, Tarvel::System::DateTime &date);

/// Reads an attribute that is "1", "true", "0" or "false", in any letter case.
void GetBoolAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, bool &flag);

/// Reads an attribute of decimal digits; leaves `number` empty when it is not there.
void GetULongOptionalAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name,
                               boost::optional<std::uint64_t> &number);

} // namespace SsoClient
