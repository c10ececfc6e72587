// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParsedDocument`, a small document, and cursors on its elements.

#pragma once

#include "xml/node_filter_iterator.h"
#include "xml/xml_text.h"

#include <tarvel/xml/document.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

namespace Testing {

class ParsedDocument {
public:
  explicit ParsedDocument(const std::string &text) { SsoClient::ParseXML(text, m_document); }

  const Tarvel::Xml::ElementNode &Root() const { return *AsConst().GetDocumentElement(); }

  /// The first child element of the root with that local name. @throws std::logic_error when there is none.
  const Tarvel::Xml::ElementNode &Child(std::string_view localName) const {
    const Tarvel::Xml::ElementNode *const child = Root().FindChildElement(localName);
    if (!child) {
      throw std::logic_error("the document has no such element");
    }
    return *child;
  }

  /// A cursor on the root.
  SsoClient::NodeFilterIterator Cursor() const { return CursorOn(Root()); }

  static SsoClient::NodeFilterIterator CursorOn(const Tarvel::Xml::Node &node) {
    return {&node, std::make_shared<SsoClient::SkipWsAndCommentsFilter>()};
  }

private:
  const Tarvel::Xml::Document &AsConst() const { return *m_document; }

  Tarvel::Ref<Tarvel::Xml::Document> m_document;
};

} // namespace Testing
