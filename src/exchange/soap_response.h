// SPDX-License-Identifier: Apache-2.0
/// @file
/// From the bytes of a response to its elements: the document, and the fault that it may hold.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/node.h>

#include <initializer_list>
#include <string_view>

namespace SsoClient {

/// The document element of what `response` holds; the reference keeps the whole tree.
/// @throws SsoException when it is not well-formed XML; the message ends in the charset that the response declares, unless
///         that is UTF-8.
Tarvel::Ref<const Tarvel::Xml::ElementNode> ParseResponseDocument(Tarvel::Reader &response);

/// Returns when there is no SOAP 1.1 fault in the body of `envelope`.
/// @throws InvalidCredentialsException for a fault that says that authentication failed, SsoException for every other
///         fault, ParseException for a fault code whose prefix is not bound.
void CheckSoapFault(const Tarvel::Xml::ElementNode &envelope);

/// Walks down from `start` by local names, to the first child of each name. Null when a step is missing, or `start` is.
const Tarvel::Xml::ElementNode *FindDescendant(const Tarvel::Xml::ElementNode *start,
                                               std::initializer_list<std::string_view> localNames) noexcept;

} // namespace SsoClient
