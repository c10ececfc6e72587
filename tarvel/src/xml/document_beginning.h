// SPDX-License-Identifier: Apache-2.0
/// @file
/// What is judged before the first markup of a document: its length, its encoding and its XML declaration.

#pragma once

#include "xml/source_cursor.h"

namespace Tarvel::Xml {

/// Passes over a byte order mark and an XML declaration, both of which may be missing.
/// @throws XMLParseException when the document is empty, too long, in another encoding than UTF-8 or another version than
///         XML 1.0, or its declaration is malformed.
void ReadDocumentBeginning(SourceCursor &cursor);

} // namespace Tarvel::Xml
