// SPDX-License-Identifier: Apache-2.0

#include "xml/expected_element.h"

#include "xml/qualified_name.h"
#include "xml/strict_checks.h"

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

bool HasLocalName(const NodeFilterIterator &iterator, std::string_view localName) {
  const ElementNode *const element = IteratorToElement(iterator);
  return element && element->GetLocalName() == localName;
}

NodeFilterIterator PastTheEnd(NodeFilterIterator iterator) {
  iterator.node = nullptr;
  return iterator;
}

/// A cursor on the first element of that name, from `iterator` on. If there is none, the cursor is on the first element
/// of that local name, or past the end.
NodeFilterIterator FindElement(NodeFilterIterator iterator, std::string_view localName, std::string_view namespaceUri) {
  NodeFilterIterator inOtherNamespace = PastTheEnd(iterator);
  for (; iterator.node; iterator.MoveToSibling()) {
    if (ElementQNameIs(IteratorToElement(iterator), localName, namespaceUri)) {
      return iterator;
    }
    if (!inOtherNamespace.node && HasLocalName(iterator, localName)) {
      inOtherNamespace = iterator;
    }
  }
  return inOtherNamespace;
}

} // namespace

NodeFilterIterator TakeElement(NodeFilterIterator &iterator, std::string_view localName, std::string_view namespaceUri,
                               DeviationSink &sink) {
  NodeFilterIterator taken = iterator;
  if (!RequireElementQName(iterator, localName, namespaceUri, sink)) {
    taken = FindElement(iterator, localName, namespaceUri);
    if (!taken.node) {
      const NodeFilterIterator first = NodeFilterIterator(iterator.parent, iterator.filter).MoveToChild();
      return FindElement(first, localName, namespaceUri);
    }
    while (iterator.node != taken.node) {
      RequireElementQName(iterator.MoveToSibling(), localName, namespaceUri, sink);
    }
  }
  iterator.MoveToSibling();
  return taken;
}

NodeFilterIterator TakeListElement(NodeFilterIterator &iterator, std::string_view localName,
                                   std::string_view namespaceUri, DeviationSink &sink) {
  const bool isTaken =
      RequireElementQName(iterator, localName, namespaceUri, sink) || HasLocalName(iterator, localName);
  NodeFilterIterator taken = isTaken ? iterator : PastTheEnd(iterator);
  iterator.MoveToSibling();
  return taken;
}

} // namespace SsoClient
