// SPDX-License-Identifier: Apache-2.0
/// @file
/// The XML reader: XML 1.0 (fifth edition) and Namespaces in XML 1.0, in UTF-8, without document type declarations.

#pragma once

#include <tarvel/xml/parser.h>

#include <string_view>

namespace Tarvel::Xml {

/// Reads a document in one pass and calls the functions of `handler` except `StartDocument` and `TakeResult`. Never
/// reads beyond the end of `source`. The time is linear in the length of the document. If something in a text must be
/// replaced, allocates one buffer, which is at most as long as the document.
/// @param source must be valid as long as the texts that `handler` keeps: those without replacements are views of it.
/// @throws XMLParseException for the first error. What can only be checked as a whole (a name, a reference, a value, a tag)
///         is reported where it begins, everything else at the first byte that is not allowed. The length and the first four
///         bytes are checked before the rest.
/// @throws what the handler throws.
void ReadDocument(std::string_view source, XMLHandler &handler);

} // namespace Tarvel::Xml
