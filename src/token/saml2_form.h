// SPDX-License-Identifier: Apache-2.0
/// @file
/// What all readers of the profile SAML2 share: which attributes an element may have, values that may be missing, and
/// content that is refused by its name.

#pragma once

#include "model/namespaces.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"
#include "xml/qualified_name.h"

#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <initializer_list>
#include <string>
#include <string_view>

namespace SsoClient {

/// How attributes in namespaces other than that of the standard are treated.
enum class ForeignAttributes { REFUSED, IGNORED };

/// The type of the standard with that name.
constexpr QNameView SamlType(std::string_view name) noexcept {
  return {Namespaces::SAML, name};
}

/// The type of elements whose text is a URI.
constexpr QNameView ANY_URI_TYPE(Namespaces::XS, "anyURI");

/// `element` must have all required attributes and may have the optional ones. An `xsi:type` must be one of `types`.
/// The schema declares the first of them. Locations of schemas are ignored.
void RequireSchemaAttributes(const Tarvel::Xml::ElementNode &element, std::initializer_list<QNameView> types,
                             std::initializer_list<QNameView> required, std::initializer_list<QNameView> optional,
                             DeviationSink &sink, ForeignAttributes foreign = ForeignAttributes::REFUSED);

/// The value of an attribute without a prefix.
boost::optional<std::string> ReadOptionalText(const Tarvel::Xml::ElementNode &element, std::string_view name);

/// The same for an attribute in the form xsd:dateTime. Empty also if it does not have this form, which is reported.
boost::optional<Tarvel::System::DateTime> ReadOptionalDate(const Tarvel::Xml::ElementNode &element,
                                                           std::string_view name, DeviationSink &sink);

/// Reads the element of that name. It must contain one text, a URI, and have no attributes of its own. Returns whether
/// `uri` was set.
bool ParseUriElement(NodeFilterIterator &iterator, std::string_view localName, std::string &uri, DeviationSink &sink);

/// Whether the element at the cursor is in the standard's namespace and has that name.
bool IsSamlElement(const NodeFilterIterator &iterator, std::string_view localName) noexcept;

/// If the node at the cursor is an element that the standard allows and this profile does not read, refuses and skips
/// it. Such elements have encrypted content, or are a `saml:BaseID`. Returns whether it was such an element.
bool TryRefuseUnsupported(NodeFilterIterator &iterator, DeviationSink &sink);

/// Refuses and skips the node at the cursor, which its parent must not contain.
/// @param allowed what the parent may contain
void RefuseContent(NodeFilterIterator &iterator, std::string_view allowed, DeviationSink &sink);

/// Refuses each node from the cursor on.
void RefuseFurtherContent(NodeFilterIterator iterator, DeviationSink &sink);

/// Refuses and skips an element that must not occur again.
void RefuseRepeated(NodeFilterIterator &iterator, DeviationSink &sink);

/// Refuses the element at the cursor if there are `MAX_REPEATED_ELEMENTS` of its kind before it. Returns whether it is
/// allowed.
/// @param count how many elements of its kind are before it
bool RequireRoomForElement(const NodeFilterIterator &iterator, std::size_t count, DeviationSink &sink);

} // namespace SsoClient
