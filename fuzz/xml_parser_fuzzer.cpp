// SPDX-License-Identifier: Apache-2.0
/// @file
/// XML documents: what is refused ends in the one documented exception; what is accepted is well-formed by libxml2's own
/// reckoning, makes the same tree as libxml2's, and is written as a document that is read as the same tree again.
/// Conversely, what libxml2 accepts is accepted unless the platform refuses it on purpose.

#include "support/xml_tree.h"

#include <tarvel/xml/parser.h>

#include <libxml/parser.h>
#include <libxml/tree.h>

#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <string>
#include <string_view>

namespace {

using namespace Tarvel::Xml;

void Require(bool condition, std::string_view what, std::string_view detail = "") {
  if (!condition) {
    std::cerr << what << ": " << detail << std::endl;
    std::abort();
  }
}

/// What libxml2 makes of the same bytes.
struct OtherOpinion {
  bool wellFormed = false;
  bool namespaceWellFormed = false;
  std::string tree; // as `DescribeTree` puts it
};

std::string_view ToView(const xmlChar *text) {
  return text ? std::string_view(reinterpret_cast<const char *>(text)) : std::string_view();
}

std::string Quote(std::string_view text) {
  return std::to_string(text.size()) + ":" + std::string(text);
}

std::string QualifiedName(const xmlNs *ns, const xmlChar *name) {
  const std::string local(ToView(name));
  return ns && ns->prefix ? std::string(ToView(ns->prefix)) + ":" + local : local;
}

/// libxml2 keeps declarations apart from attributes, so that they are left out on both sides.
std::string DescribeOpening(const xmlNode &node) {
  std::string description = "(" + Quote(QualifiedName(node.ns, node.name));
  for (const xmlAttr *attribute = node.properties; attribute; attribute = attribute->next) {
    const std::unique_ptr<xmlChar, void (*)(void *)> value(xmlNodeListGetString(node.doc, attribute->children, 1),
                                                           [](void *text) { xmlFree(text); });
    description += " @" + Quote(QualifiedName(attribute->ns, attribute->name)) + "=" + Quote(ToView(value.get()));
  }
  return description;
}

std::string DescribeOpening(const ElementNode &element) {
  std::string description = "(" + Quote(element.GetName());
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (!attribute->IsNamespaceDeclaration()) {
      description += " @" + Quote(attribute->GetName()) + "=" + Quote(attribute->GetValue());
    }
  }
  return description;
}

bool IsCharacterData(const xmlNode &node) {
  return node.type == XML_TEXT_NODE || node.type == XML_CDATA_SECTION_NODE;
}

/// Elements and text of libxml2's tree in document order; adjacent text and CDATA are one, as in ours.
std::string Describe(const xmlNode *top) {
  std::string description;
  std::string text;
  const auto endText = [&] {
    if (!text.empty()) {
      description += " text=" + Quote(text);
      text.clear();
    }
  };
  const xmlNode *node = top;
  while (node) {
    if (IsCharacterData(*node)) {
      text += ToView(node->content);
    } else {
      endText();
      description += node->type == XML_ELEMENT_NODE ? DescribeOpening(*node) : " other";
    }
    if (node->type == XML_ELEMENT_NODE && node->children) {
      node = node->children;
      continue;
    }
    description += node->type == XML_ELEMENT_NODE ? ")" : "";
    while (node != top && !node->next) {
      endText();
      node = node->parent;
      description += ")";
    }
    node = node == top ? nullptr : node->next;
  }
  return description;
}

std::string Describe(const ElementNode &top) {
  std::string description;
  const Node *node = &top;
  while (node) {
    if (const ElementNode *const element = AsElement(node)) {
      description += DescribeOpening(*element);
    } else {
      const TextNode *const text = AsText(node);
      description += text ? " text=" + Quote(text->GetValue()) : " other";
    }
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    description += AsElement(node) ? ")" : "";
    while (node != &top && !node->GetNextSibling()) {
      node = node->GetParent();
      description += ")";
    }
    node = node == &top ? nullptr : node->GetNextSibling();
  }
  return description;
}

OtherOpinion Ask(const std::string &text) {
  OtherOpinion opinion;
  const std::unique_ptr<xmlParserCtxt, decltype(&xmlFreeParserCtxt)> parser(xmlNewParserCtxt(), &xmlFreeParserCtxt);
  const std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> document(
      xmlCtxtReadMemory(parser.get(), text.data(), static_cast<int>(text.size()), nullptr, nullptr,
                        XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING | XML_PARSE_NOENT | XML_PARSE_HUGE),
      &xmlFreeDoc);
  opinion.wellFormed = document != nullptr;
  opinion.namespaceWellFormed = document && parser->nsWellFormed;
  if (document) {
    opinion.tree = Describe(xmlDocGetRootElement(document.get()));
  }
  return opinion;
}

/// Whether the exception is about what the platform refuses although XML allows it.
bool IsOnPurpose(std::string_view message) {
  for (const std::string_view reason :
       {"a document type declaration is not accepted", "only UTF-8 is accepted", "the document holds a null byte",
        "the document is not UTF-8", "the document is declared as US-ASCII", "is not 1.0",
        "has more than 256 attributes", "are nested deeper than 256", "namespace declarations are in scope"}) {
    if (message.find(reason) != std::string_view::npos) {
      return true;
    }
  }
  return false;
}

void CheckAccepted(const Document &document, const OtherOpinion &opinion) {
  const ElementNode &root = *document.GetDocumentElement();
  Require(opinion.wellFormed, "accepted what libxml2 refuses");
  const std::string tree = Describe(root);
  Require(tree == opinion.tree, "another tree than libxml2's", tree + "\n" + opinion.tree);
  const auto again = Testing::ParseDocument(Testing::WriteElement(root));
  Require(Testing::DescribeTree(*again->GetDocumentElement()) == Testing::DescribeTree(root), "written as another tree",
          Testing::WriteElement(root));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string text(reinterpret_cast<const char *>(data), size);
  const OtherOpinion opinion = Ask(text);
  Tarvel::Ref<Document> document;
  try {
    document = Testing::ParseDocument(text);
  } catch (const XMLParseException &exception) {
    Require(exception.GetLine() > 0 && exception.GetColumn() > 0, "no position", exception.what());
    Require(!opinion.namespaceWellFormed || IsOnPurpose(exception.what()), "refused what libxml2 accepts",
            exception.what());
    return 0;
  }
  CheckAccepted(*document, opinion);
  return 0;
}
