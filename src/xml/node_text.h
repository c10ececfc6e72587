// SPDX-License-Identifier: Apache-2.0
/// @file
/// The text of an element.

#pragma once

#include <tarvel/xml/node.h>

#include <string>

namespace SsoClient {

/// The first child of `node` when that is a text; null for a null node, without children, and when something else, be
/// it a comment, comes first.
const Tarvel::Xml::TextNode *GetTextNode(const Tarvel::Xml::Node *node) noexcept;

/// The value of `textNode`; empty for null.
std::string GetText(const Tarvel::Xml::TextNode *textNode);

} // namespace SsoClient
