// SPDX-License-Identifier: Apache-2.0
/// @file
/// The checks by which the assertion parser refuses everything that it does not know.
///
/// A check that fails reports to a sink, and does not change its arguments. The sink of a verification throws a
/// `ParseException`. If the sink does not throw, a check reports everything that it refuses. The message contains the
/// element's name, unless the caller passes the message. Checks of content use the cursor, so they ignore comments and
/// white space between nodes.

#pragma once

#include "xml/deviation_sink.h"
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
/// @throws ParseException otherwise.
const Tarvel::Xml::ElementNode &RequireElementQName(const Tarvel::Xml::ElementNode *element, std::string_view localName,
                                                    std::string_view namespaceUri);

/// The element at the cursor must have that name. Returns whether it has.
bool RequireElementQName(const NodeFilterIterator &iterator, std::string_view localName, std::string_view namespaceUri,
                         DeviationSink &sink);

/// The element at the cursor must have no content.
void RequireEmptyElement(NodeFilterIterator iterator, DeviationSink &sink = ThrowingSink());

/// The cursor must be past the end. Otherwise each node from the cursor on is refused with the text `message`.
void RequireNoFurtherNode(NodeFilterIterator iterator, const char *message, DeviationSink &sink = ThrowingSink());

/// Refuses the node at the cursor, because nothing may follow, with the text `message`.
void RefuseFurtherNode(const NodeFilterIterator &iterator, const char *message, DeviationSink &sink);

/// `element` must have no attributes except namespace declarations.
void RequireNoAttributes(const Tarvel::Xml::ElementNode &element, DeviationSink &sink = ThrowingSink());

/// `element` must have all required attributes and may have the optional ones and namespace declarations, but no others. The
/// names are compared as they are written.
void RequireElementAttributesNames(const Tarvel::Xml::ElementNode &element,
                                   std::initializer_list<std::string_view> required,
                                   std::initializer_list<std::string_view> optional,
                                   DeviationSink &sink = ThrowingSink());

/// The same, but attributes are compared by qualified name, and other attributes are ignored if `isIgnored` returns
/// true for their names.
void RequireElementAttributesQNames(const Tarvel::Xml::ElementNode &element, std::initializer_list<QNameView> required,
                                    std::initializer_list<QNameView> optional, DeviationSink &sink = ThrowingSink(),
                                    bool (*isIgnored)(const QNameView &name) = nullptr);

/// The element at the cursor must contain one text and nothing else. Two texts with a comment between them are refused, so
/// that a comment cannot cut off a part of a value. White space at either end is the exception: if a comment separates
/// it from the rest, the cursor does not show it. Returns whether `text` was set.
bool RequireTextualContent(const NodeFilterIterator &iterator, std::string &text, DeviationSink &sink = ThrowingSink());

/// The value of an attribute without a prefix; empty when there is no such attribute.
std::string_view GetTextAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name) noexcept;

/// Reads an attribute in the form xsd:dateTime. An attribute that is missing is refused like an empty one.
void GetDateAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, Tarvel::System::DateTime &date);

/// The same, but an attribute that is missing is not refused: `RequireElementAttributesNames` has reported it. Returns
/// whether `date` was set.
bool GetDateAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, Tarvel::System::DateTime &date,
                      DeviationSink &sink);

/// Reads an attribute that is "1", "true", "0" or "false", in any letter case.
void GetBoolAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name, bool &flag,
                      DeviationSink &sink = ThrowingSink());

/// Reads an attribute that consists of decimal digits. `number` is empty when there is no such attribute.
void GetULongOptionalAttribute(const Tarvel::Xml::ElementNode &element, std::string_view name,
                               boost::optional<std::uint64_t> &number, DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
