// SPDX-License-Identifier: Apache-2.0

#include "xml_tree.h"

#include "refusal.h"

#include <libxml/parser.h>
#include <libxml/valid.h>

#include <limits>
#include <new>

namespace DevSts {

namespace {

struct ParserDeleter {
  void operator()(xmlParserCtxt *parser) const noexcept { xmlFreeParserCtxt(parser); }
};

std::string ToString(const xmlChar *text) {
  return text ? reinterpret_cast<const char *>(text) : "";
}

template <typename Node>
Node &RequireMemory(Node *node) {
  if (!node) {
    throw std::bad_alloc();
  }
  return *node;
}

// Called by libxml2 as soon as it sees a DOCTYPE, before it reads any declaration in it.
void StopAtDoctype(void *context, const xmlChar *, const xmlChar *, const xmlChar *) {
  auto *const parser = static_cast<xmlParserCtxt *>(context);
  parser->_private = parser; // marks that it stopped because of the DOCTYPE
  xmlStopParser(parser);
}

xmlNs &NamespaceInScope(xmlNode &element, const Namespace &ns) {
  xmlNs *const found = xmlSearchNs(element.doc, &element, XmlText(ns.prefix));
  if (found && xmlStrEqual(found->href, XmlText(ns.uri))) {
    return *found;
  }
  return RequireMemory(xmlNewNs(&element, XmlText(ns.uri), XmlText(ns.prefix)));
}

bool IsIdentifier(const xmlAttr &attribute) {
  const std::string name = ToString(attribute.name);
  if (!attribute.ns) {
    return name == "ID" || name == "Id";
  }
  const std::string uri = ToString(attribute.ns->href);
  return (name == "Id" && uri == Ns::WSU.uri) || (name == "id" && uri == ToString(XML_XML_NAMESPACE));
}

std::string ValueOf(const xmlAttr &attribute) {
  xmlChar *const value = xmlNodeListGetString(attribute.doc, attribute.children, 1);
  std::string copy = ToString(value);
  xmlFree(value);
  return copy;
}

void RegisterIdentifier(xmlNode &element, xmlAttr &attribute, Identifiers &identifiers) {
  const std::string value = ValueOf(attribute);
  // libxml2 handles xml:id itself, and so may have registered the identifier already.
  const bool isKnown = attribute.atype == XML_ATTRIBUTE_ID;
  if (!identifiers.emplace(value, &element).second ||
      (!isKnown && !xmlAddID(nullptr, element.doc, XmlText(value.c_str()), &attribute))) {
    throw Refusal(Code::INVALID_SECURITY, "the identifier '" + value + "' occurs twice");
  }
}

/// The next node in document order, without recursion.
xmlNode *NextNode(xmlNode *node) {
  if (node->type == XML_ELEMENT_NODE && node->children) {
    return node->children;
  }
  while (node && !node->next) {
    node = node->parent;
  }
  return node ? node->next : nullptr;
}

} // namespace

Document ParseMessage(std::string_view xml) {
  if (xml.size() > static_cast<std::size_t>(std::numeric_limits<int>::max())) {
    throw Refusal(Code::CLIENT, "the message is too long");
  }
  const std::unique_ptr<xmlParserCtxt, ParserDeleter> parser(xmlNewParserCtxt());
  RequireMemory(parser.get());
  parser->sax->internalSubset = StopAtDoctype;
  constexpr int OPTIONS = XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING;
  Document document(
      xmlCtxtReadMemory(parser.get(), xml.data(), static_cast<int>(xml.size()), nullptr, nullptr, OPTIONS));
  if (parser->_private) {
    throw Refusal(Code::CLIENT, "a SOAP message must not contain a document type declaration");
  }
  if (!document || !parser->wellFormed || !parser->nsWellFormed || !xmlDocGetRootElement(document.get())) {
    throw Refusal(Code::CLIENT, "the message is not well-formed XML");
  }
  return document;
}

bool IsElement(const xmlNode &node, const Namespace &ns, std::string_view name) {
  return node.type == XML_ELEMENT_NODE && IsOf(node, ns) && name == reinterpret_cast<const char *>(node.name);
}

bool IsOf(const xmlNode &element, const Namespace &ns) {
  return element.ns && xmlStrEqual(element.ns->href, XmlText(ns.uri));
}

std::vector<xmlNode *> ChildElements(const xmlNode &parent) {
  std::vector<xmlNode *> children;
  for (xmlNode *child = parent.children; child; child = child->next) {
    if (child->type == XML_ELEMENT_NODE) {
      children.push_back(child);
    }
  }
  return children;
}

xmlNode *FindChild(const xmlNode &parent, const Namespace &ns, std::string_view name) {
  xmlNode *found = nullptr;
  for (xmlNode *child : ChildElements(parent)) {
    if (!IsElement(*child, ns, name)) {
      continue;
    }
    if (found) {
      throw Refusal(Code::INVALID_REQUEST, "several " + std::string(ns.prefix) + ":" + std::string(name));
    }
    found = child;
  }
  return found;
}

xmlNode &RequireChild(const xmlNode &parent, const Namespace &ns, std::string_view name) {
  xmlNode *const found = FindChild(parent, ns, name);
  if (!found) {
    throw Refusal(Code::INVALID_REQUEST, "no " + std::string(ns.prefix) + ":" + std::string(name));
  }
  return *found;
}

std::string TextOf(const xmlNode &element) {
  std::string text;
  for (const xmlNode *child = element.children; child; child = child->next) {
    if (child->type != XML_TEXT_NODE && child->type != XML_CDATA_SECTION_NODE) {
      throw Refusal(Code::INVALID_REQUEST, ToString(element.name) + " must contain only text");
    }
    text += ToString(child->content);
  }
  return text;
}

std::optional<std::string> AttributeOf(const xmlNode &element, const char *name) {
  const xmlAttr *const attribute = xmlHasNsProp(&element, XmlText(name), nullptr);
  return attribute ? std::optional(ValueOf(*attribute)) : std::nullopt;
}

std::optional<std::string> AttributeOf(const xmlNode &element, const Namespace &ns, const char *name) {
  const xmlAttr *const attribute = xmlHasNsProp(&element, XmlText(name), XmlText(ns.uri));
  return attribute ? std::optional(ValueOf(*attribute)) : std::nullopt;
}

Identifiers RegisterIdentifiers(xmlDoc &document) {
  Identifiers identifiers;
  for (xmlNode *node = xmlDocGetRootElement(&document); node; node = NextNode(node)) {
    if (node->type != XML_ELEMENT_NODE) {
      continue;
    }
    bool identified = false;
    for (xmlAttr *attribute = node->properties; attribute; attribute = attribute->next) {
      if (!IsIdentifier(*attribute)) {
        continue;
      }
      if (identified) {
        throw Refusal(Code::INVALID_SECURITY, "one element has several identifiers");
      }
      identified = true;
      RegisterIdentifier(*node, *attribute, identifiers);
    }
  }
  return identifiers;
}

Document NewDocument(const Namespace &ns, const char *rootName) {
  Document document(xmlNewDoc(XmlText("1.0")));
  RequireMemory(document.get());
  xmlNode &root = RequireMemory(xmlNewDocNode(document.get(), nullptr, XmlText(rootName), nullptr));
  xmlDocSetRootElement(document.get(), &root);
  xmlSetNs(&root, &NamespaceInScope(root, ns));
  return document;
}

void DeclareNamespace(xmlNode &element, const Namespace &ns) {
  NamespaceInScope(element, ns);
}

xmlNode &AddElement(xmlNode &parent, const Namespace &ns, const char *name, std::string_view text) {
  xmlNode &element = RequireMemory(xmlNewDocNode(parent.doc, nullptr, XmlText(name), nullptr));
  xmlAddChild(&parent, &element);
  xmlSetNs(&element, &NamespaceInScope(element, ns));
  SetText(element, text);
  return element;
}

void SetAttribute(xmlNode &element, const char *name, const std::string &value) {
  RequireMemory(xmlSetNsProp(&element, nullptr, XmlText(name), XmlText(value.c_str())));
}

void SetAttribute(xmlNode &element, const Namespace &ns, const char *name, const std::string &value) {
  RequireMemory(xmlSetNsProp(&element, &NamespaceInScope(element, ns), XmlText(name), XmlText(value.c_str())));
}

void SetText(xmlNode &element, std::string_view text) {
  xmlNodeSetContent(&element, nullptr);
  if (!text.empty()) {
    const std::string copy(text);
    xmlAddChild(&element, &RequireMemory(xmlNewDocText(element.doc, XmlText(copy.c_str()))));
  }
}

std::string Serialise(xmlDoc &document) {
  const std::unique_ptr<xmlBuffer, void (*)(xmlBuffer *)> buffer(xmlBufferCreate(), xmlBufferFree);
  RequireMemory(buffer.get());
  if (xmlNodeDump(buffer.get(), &document, xmlDocGetRootElement(&document), 0, 0) < 0) {
    throw std::bad_alloc();
  }
  return {reinterpret_cast<const char *>(xmlBufferContent(buffer.get())),
          static_cast<std::size_t>(xmlBufferLength(buffer.get()))};
}

} // namespace DevSts
