// SPDX-License-Identifier: Apache-2.0

#include "libxml2_oracle.h"

#include <libxml/c14n.h>
#include <libxml/parser.h>
#include <libxml/xmlIO.h>

#include <mutex>
#include <stdexcept>

namespace Testing {

namespace {

struct Subset {
  const xmlNode *apex;
  const xmlNode *omitted;
};

/// Attributes and namespaces are in the subset when their element is.
int IsInSubset(void *data, xmlNode *node, xmlNode *parent) {
  const Subset &subset = *static_cast<const Subset *>(data);
  const bool belongsToElement = node->type == XML_ATTRIBUTE_NODE || node->type == XML_NAMESPACE_DECL;
  bool isWithin = subset.apex == nullptr;
  for (const xmlNode *above = belongsToElement ? parent : node; above; above = above->parent) {
    if (above == subset.omitted) {
      return 0;
    }
    isWithin = isWithin || above == subset.apex;
  }
  return isWithin ? 1 : 0;
}

xmlNode *NextInDocument(xmlNode *node) {
  if (node->children) {
    return node->children;
  }
  while (node && !node->next) {
    node = node->parent;
  }
  return node ? node->next : nullptr;
}

void SayNothing(void *, const char *, ...) {}

template <typename Predicate>
xmlNode *FindElement(xmlDoc &document, Predicate isWanted) {
  for (xmlNode *node = document.children; node && node->type != XML_DOCUMENT_NODE; node = NextInDocument(node)) {
    if (node->type == XML_ELEMENT_NODE && isWanted(*node)) {
      return node;
    }
  }
  return nullptr;
}

} // namespace

XmlDocHandle ParseWithLibxml2(std::string_view text) {
  static std::once_flag once;
  std::call_once(once, [] { xmlSetGenericErrorFunc(nullptr, SayNothing); }); // hundreds of refusals are expected
  return XmlDocHandle(xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr,
                                    XML_PARSE_NONET | XML_PARSE_NOENT | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
}

xmlNode *ElementOfLibxml2(xmlDoc &document, std::size_t index) {
  return FindElement(document, [index](const xmlNode &) mutable { return index-- == 0; });
}

xmlNode *ElementOfLibxml2(xmlDoc &document, std::string_view localName) {
  return FindElement(
      document, [localName](const xmlNode &node) { return localName == reinterpret_cast<const char *>(node.name); });
}

bool HasRelativeNamespaceName(xmlDoc &document) {
  return FindElement(document, [](const xmlNode &node) {
           for (const xmlNs *declared = node.nsDef; declared; declared = declared->next) {
             const std::string_view name = reinterpret_cast<const char *>(declared->href);
             if (!name.empty() && name.find(':') == std::string_view::npos) {
               return true;
             }
           }
           return false;
         }) != nullptr;
}

std::string CanonicalFormOfLibxml2(xmlDoc &document, const xmlNode *apex, const xmlNode *omitted,
                                   const OracleMethod &method) {
  std::vector<std::string> names = method.inclusivePrefixes;
  std::vector<xmlChar *> prefixes;
  for (std::string &name : names) {
    prefixes.push_back(reinterpret_cast<xmlChar *>(name.data()));
  }
  prefixes.push_back(nullptr);
  Subset subset{apex, omitted};
  xmlOutputBuffer *const buffer = xmlAllocOutputBuffer(nullptr);
  const int outcome =
      xmlC14NExecute(&document, apex || omitted ? IsInSubset : nullptr, &subset,
                     method.isExclusive ? XML_C14N_EXCLUSIVE_1_0 : XML_C14N_1_0,
                     prefixes.size() > 1 ? prefixes.data() : nullptr, method.withComments ? 1 : 0, buffer);
  std::string canonical(reinterpret_cast<const char *>(xmlOutputBufferGetContent(buffer)),
                        xmlOutputBufferGetSize(buffer));
  xmlOutputBufferClose(buffer);
  if (outcome < 0) {
    throw std::runtime_error("libxml2 refuses to canonicalise");
  }
  return canonical;
}

} // namespace Testing
