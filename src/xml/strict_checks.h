// SPDX-License-Identifier: Apache-2.0
/// @file
/// The checks by which the assertion parser refuses everything that it does not know.
///
/// A check that fails throws a `ParseException` and does not change its arguments. The message names the element,
/// unless the caller passes the message. Checks of content use the cursor, so they ignore comments and white space
/// between nodes.

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

/// `element` must have that name and not be null. Returns it.
const Tarvel::Xml::ElementNode &RequireElementQName(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                                                    std::string_view namespaceUri);

/// The element at the cursor must have no content.
void RequireEmptyElement(NodeFilterIterator iterator);

/// The cursor must be past the end. Otherwise the exception has the text `message`.
void RequireNoFurtherNode(const NodeFilterIterator &iterator, const char *message);

/// `element` must have no attributes except namespace declarations.
void RequireNoAttributes(const Tarvel::Xml::ElementNode &element);

/// `element` must have all required attributes and may have the optional ones and namespace declarations, but no others. The
/// names are compared as they are written.
void RequireElementAttributesNames(const Tarvel::Xml::ElementNode &element,
                                   std::initializer_list<std::string_view> required,
                                   std::initializer_list<std::string_view> optional);

/// The same, but attributes are compared by qualified name.
void RequireElementAttributesQNames(const Tarvel::Xml::ElementNode &element, std::initializer_list<QNameView> required,
                                    std::initializer_list<QNameView> optional);

/// The element at the cursor must contain one text and nothing else. Two texts with a comment between them are refused, so
/// that a comment cannot cut off a part of a value. White space at either end is the exception: if a comment separates
/// it from the rest, the cursor does not show it.
void RequireTextualContent(NodeFilterIterator iterator, std::string &text);

/// The value of an attribute without a prefix; empty when there is no such attribute.
std::string_view GetTextAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name) noexcept;

/// Reads an attribute in the form xsd:dateTime.
void GetDateAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, Tarvel::System::DateTime &date);

/// Reads an attribute that is "1", "true", "0" or "false", in any letter case.
void GetBoolAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, bool &flag);

/// Reads an attribute that consists of decimal digits. `number` is empty when there is no such attribute.
void GetULongOptionalAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name,
                               boost::optional<std::uint64_t> &number);

} // namespace SsoClient
