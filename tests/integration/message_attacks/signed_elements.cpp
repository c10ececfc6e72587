// SPDX-License-Identifier: Apache-2.0

#include "signed_elements.h"

#include "judged_message.h"
#include "message_files.h"

#include "integration/signature_oracle/libxml2_oracle.h"

#include <libxml/uri.h>

#include <memory>
#include <optional>
#include <stdexcept>
#include <string_view>
#include <vector>

namespace Messages {

namespace {

using SsoClient::VerifiedMessage;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

struct UriDeleter {
  void operator()(xmlURI *uri) const noexcept { xmlFreeURI(uri); }
};
using Uri = std::unique_ptr<xmlURI, UriDeleter>;

/// The position of the element among the elements of its parent, and of each of its ancestors, from the document element.
std::vector<std::size_t> PositionOf(const ElementNode &element) {
  std::vector<std::size_t> position;
  for (const Node *node = &element; AsElement(node->GetParent()); node = node->GetParent()) {
    std::size_t before = 0;
    for (const Node *one = node->GetParent()->GetFirstChild(); one != node; one = one->GetNextSibling()) {
      before += AsElement(one) ? 1u : 0u;
    }
    position.insert(position.begin(), before);
  }
  return position;
}

const xmlNode *ChildElement(const xmlNode *parent, std::size_t index) {
  const xmlNode *child = parent ? parent->children : nullptr;
  while (child && (child->type != XML_ELEMENT_NODE || index-- != 0)) {
    child = child->next;
  }
  return child;
}

const xmlNode *FindAt(xmlDoc &document, const std::vector<std::size_t> &position) {
  const xmlNode *node = xmlDocGetRootElement(&document);
  for (const std::size_t index : position) {
    node = ChildElement(node, index);
  }
  return node;
}

/// The last child element of the document element: the body.
const xmlNode *BodyOf(xmlDoc &document) {
  return xmlLastElementChild(xmlDocGetRootElement(&document));
}

bool IsOrContains(const xmlNode *element, const xmlNode *other) {
  while (other && other != element) {
    other = other->parent;
  }
  return other != nullptr;
}

bool IsAbsolute(const std::string &uri) {
  const Uri parsed(xmlParseURI(uri.c_str()));
  return parsed && parsed->scheme;
}

/// Replaces namespace names without a scheme, because with one of them anywhere in a document libxml2 canonicalises no part
/// of it. No genuine message has one in what is signed.
void MakeNamespaceNamesAbsolute(xmlNode *top) {
  for (xmlNode *node = top; node; node = node->next) {
    for (xmlNs *declared = node->type == XML_ELEMENT_NODE ? node->nsDef : nullptr; declared;
         declared = declared->next) {
      const std::string name = reinterpret_cast<const char *>(declared->href);
      if (!name.empty()) {
        xmlFree(const_cast<xmlChar *>(declared->href));
        declared->href = xmlStrdup(Testing::XmlText(IsAbsolute(name) ? name.c_str() : ("urn:" + name).c_str()));
      }
    }
    MakeNamespaceNamesAbsolute(node->children);
  }
}

/// The canonical form of what `covered` covers, by libxml2; nullopt if the document of libxml2 has no such element. An element
/// that contains the signature is covered without it.
std::optional<std::string> CanonicalForm(xmlDoc &document, const VerifiedMessage::CoveredElement &covered) {
  const xmlNode *const element = FindAt(document, PositionOf(*covered.element));
  const xmlNode *const omitted = covered.omitted ? FindAt(document, PositionOf(*covered.omitted)) : nullptr;
  if (!element || (covered.omitted && !omitted)) {
    return std::nullopt;
  }
  Testing::OracleMethod method;
  method.isExclusive = true;
  return Testing::CanonicalFormOfLibxml2(document, element, omitted, method);
}

} // namespace

SignedElements::SignedElements() {
  for (const MessageFile &file : AllMessageFiles()) {
    if (!file.IsAccepted() || file.text != "message-signature") {
      continue;
    }
    const Decision decision = Judge(MakeReceiver(file.options), file.xml);
    const Testing::XmlDocHandle document = Testing::ParseWithLibxml2(file.xml);
    for (const VerifiedMessage::CoveredElement &covered : decision.message.value().covered) {
      m_canonicalForms.insert(CanonicalForm(*document, covered).value());
    }
  }
  if (m_canonicalForms.size() < 5) {
    throw std::logic_error("there are too few signed elements");
  }
}

std::string SignedElements::FindFault(const std::string &xml, const VerifiedMessage &message) const {
  const Testing::XmlDocHandle document = Testing::ParseWithLibxml2(xml);
  if (!document) {
    return "libxml2 does not read the message";
  }
  MakeNamespaceNamesAbsolute(document->children);
  bool isBodyCovered = false;
  for (const VerifiedMessage::CoveredElement &covered : message.covered) {
    const std::optional<std::string> form = CanonicalForm(*document, covered);
    if (!form || m_canonicalForms.count(*form) == 0) {
      return covered.path + " was not signed";
    }
    isBodyCovered = isBodyCovered || IsOrContains(FindAt(*document, PositionOf(*covered.element)), BodyOf(*document));
  }
  return isBodyCovered ? "" : "the body is not covered";
}

} // namespace Messages
