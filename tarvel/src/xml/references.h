// SPDX-License-Identifier: Apache-2.0
/// @file
/// References to characters and to the five entities that need no declaration.

#pragma once

#include "xml/source_cursor.h"

#include <cstddef>

namespace Tarvel::Xml {

/// Reads the reference that begins with the next character, "&".
/// @param replacement receives the character as UTF-8, which is never longer than the reference. @return its length.
/// @throws XMLParseException when the reference is malformed, or is to an undefined entity or to something that is not
///         an XML character.
std::size_t ReadReference(SourceCursor &cursor, char (&replacement)[4]);

} // namespace Tarvel::Xml
