// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseXML`, from text to document.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>

#include <string>

namespace SsoClient {

/// Reads `reader` to its end and puts the document that it holds in the place of what `document` held; when it throws,
/// `document` is left alone.
/// @throws Tarvel::Xml::XMLParseException and Tarvel::IOException as the platform's parser does.
void ParseXML(Tarvel::Reader &reader, Tarvel::Ref<Tarvel::Xml::Document> &document);

/// The same for a text.
void ParseXML(const std::string &text, Tarvel::Ref<Tarvel::Xml::Document> &document);

} // namespace SsoClient
