// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading and building libxml2 trees.

#pragma once

#include "names.h"

#include <libxml/tree.h>

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace DevSts {

struct DocumentDeleter {
  void operator()(xmlDoc *document) const noexcept { xmlFreeDoc(document); }
};
using Document = std::unique_ptr<xmlDoc, DocumentDeleter>;

inline const xmlChar *XmlText(const char *text) {
  return reinterpret_cast<const xmlChar *>(text);
}

/// Parses a message from the network: no DOCTYPE, only the predefined entities, nothing is fetched, at most 256 levels.
/// @throws Refusal (soapenv:Client)
Document ParseMessage(std::string_view xml);

bool IsElement(const xmlNode &node, const Namespace &ns, std::string_view name);

/// Whether the name of the element is in the namespace.
bool IsOf(const xmlNode &element, const Namespace &ns);

/// The children that are elements, in document order.
std::vector<xmlNode *> ChildElements(const xmlNode &parent);

/// The child of that name; null when there is none. @throws Refusal (wst:InvalidRequest) when there are several
xmlNode *FindChild(const xmlNode &parent, const Namespace &ns, std::string_view name);

/// The child of that name. @throws Refusal (wst:InvalidRequest) when there is not exactly one
xmlNode &RequireChild(const xmlNode &parent, const Namespace &ns, std::string_view name);

/// The text of an element that contains only text. @throws Refusal (wst:InvalidRequest) when it contains anything else
std::string TextOf(const xmlNode &element);

/// The attribute without namespace.
std::optional<std::string> AttributeOf(const xmlNode &element, const char *name);
std::optional<std::string> AttributeOf(const xmlNode &element, const Namespace &ns, const char *name);

/// The elements of a document by their identifiers: the attributes ID, Id, wsu:Id and xml:id.
using Identifiers = std::map<std::string, xmlNode *>;

/// Collects the identifiers and makes them known to libxml2, and so to the signature engine.
/// @throws Refusal (wsse:InvalidSecurity) when one occurs twice, or when an element has several
Identifiers RegisterIdentifiers(xmlDoc &document);

/// A document whose root is a new element.
Document NewDocument(const Namespace &ns, const char *rootName);

/// Declares the namespace on the element.
void DeclareNamespace(xmlNode &element, const Namespace &ns);

/// Appends an element. The namespace is declared on it when it is not in scope.
xmlNode &AddElement(xmlNode &parent, const Namespace &ns, const char *name, std::string_view text = {});

void SetAttribute(xmlNode &element, const char *name, const std::string &value);
/// The namespace is declared on the element when it is not in scope.
void SetAttribute(xmlNode &element, const Namespace &ns, const char *name, const std::string &value);

void SetText(xmlNode &element, std::string_view text);

/// The document as UTF-8, without an XML declaration.
std::string Serialise(xmlDoc &document);

} // namespace DevSts
