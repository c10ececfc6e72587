// SPDX-License-Identifier: Apache-2.0
/// @file
/// `WriteMessage`, the text of a message.

#pragma once

#include <tarvel/xml/document.h>

#include <string>

namespace SsoClient {

/// The document as UTF-8 text without an XML declaration, with the comments and processing instructions before and
/// after the document element. White space outside of the document element becomes one line end between two of these
/// nodes.
std::string WriteMessage(const Tarvel::Xml::Document &document);

} // namespace SsoClient
