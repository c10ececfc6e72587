// SPDX-License-Identifier: Apache-2.0

#include "xml/node_text.h"

namespace SsoClient {

const Tarvel::Xml::TextNode *GetTextNode(const Tarvel::Xml::Node *node) noexcept {
  return node ? Tarvel::Xml::AsText(node->GetFirstChild()) : nullptr;
}

std::string GetText(const Tarvel::Xml::TextNode *textNode) {
  return textNode ? std::string(textNode->GetValue()) : std::string();
}

} // namespace SsoClient
