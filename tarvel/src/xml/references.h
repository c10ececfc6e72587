// SPDX-License-Identifier: Apache-2.0
/// @file
/// References to characters and to the five entities that need no declaration.

#pragma once

#include "xml/source_cursor.h"

#include <cstddef>

namespace Tarvel::Xml {

/// Reads the reference that the "&" that comes next begins.
/// @param replacement receives the character as UTF-8, which is never longer than the reference. @return its length.
/// @throws XMLParseException when it is malformed, or refers to an entity that would have to be declared or to what is not
///         a character of XML.
std::size_t ReadReference(SourceCursor &cursor, char (&replacement)[4]);

} // namespace Tarvel::Xml
