// SPDX-License-Identifier: Apache-2.0
/// @file
/// From XML text to a tree and back: parse a document, read the text of an element, write an element's canonical form.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>

#include <string>

namespace SsoClient {

/// Reads `reader` to its end and sets `document` to what was read. When it throws, `document` keeps its value.
/// @throws Tarvel::Xml::XMLParseException and Tarvel::IOException like the platform's parser.
void ParseXML(Tarvel::Reader &reader, Tarvel::Ref<Tarvel::Xml::Document> &document);

/// The same for a text.
void ParseXML(const std::string &text, Tarvel::Ref<Tarvel::Xml::Document> &document);

/// The first child of `node` if that is a text. Null for a null node, for a node without children, and when the
/// first child is anything else, even a comment.
const Tarvel::Xml::TextNode *GetTextNode(const Tarvel::Xml::Node *node) noexcept;

/// The value of `textNode`; empty for null.
std::string GetText(const Tarvel::Xml::TextNode *textNode);

/// The canonical form (inclusive Canonical XML 1.0) of `element` in its document. It declares all namespaces that it
/// needs, so it is a document of its own, and a signature in it stays valid.
/// @throws Tarvel::Xml::Security::XmlSecurityException when there is no canonical form, for example because a prefix is
///         not bound.
std::string CanonicalElementText(const Tarvel::Xml::ElementNode &element);

} // namespace SsoClient
