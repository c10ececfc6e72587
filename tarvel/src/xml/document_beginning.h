// SPDX-License-Identifier: Apache-2.0
/// @file
/// What is checked before the first markup of a document: its length, its encoding and its XML declaration.

#pragma once

#include "xml/source_cursor.h"

namespace Tarvel::Xml {

/// Skips a byte order mark and an XML declaration, both of which may be missing.
/// @throws XMLParseException when the document is empty, too long, in an encoding other than UTF-8 or US-ASCII or a
///         version other than XML 1.0, or when its declaration is malformed.
void ReadDocumentBeginning(SourceCursor &cursor);

} // namespace Tarvel::Xml
