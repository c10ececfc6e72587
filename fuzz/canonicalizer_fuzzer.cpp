// SPDX-License-Identifier: Apache-2.0
/// @file
/// Canonicalisation: the canonical form that we write for a document, or for a part of it, is that of libxml2 and the
/// one that follows from expat's events. The first byte of the input chooses algorithm, prefix list and part; the rest
/// is the document.

#include "integration/signature_oracle/expat_oracle.h"

#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>

#include <libxml/c14n.h>
#include <libxml/parser.h>
#include <libxml/tree.h>
#include <libxml/xmlIO.h>

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace {

namespace Uri = Tarvel::Xml::Security::CanonicalizationUri;
using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

constexpr std::string_view ALGORITHMS[] = {Uri::INCLUSIVE, Uri::INCLUSIVE_WITH_COMMENTS, Uri::EXCLUSIVE,
                                           Uri::EXCLUSIVE_WITH_COMMENTS};

struct Choice {
  bool isExclusive;
  bool withComments;
  bool hasPrefixList;
  std::size_t part; // 0 is the document, n its element number n
};

Choice Choose(std::uint8_t byte) {
  return {(byte & 2) != 0, (byte & 1) != 0, (byte & 2) != 0 && (byte & 0x40) != 0, (byte >> 2) & 0xFu};
}

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// The next node in document order; both kinds of tree have the same shape.
const Node *Next(const Node *node) {
  if (node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node ? node->GetNextSibling() : nullptr;
}

/// libxml2 writes namespace names without the escapes that the recommendation requires: such documents cannot be
/// compared.
bool HasNamespaceNameToEscape(const Document &document) {
  for (const Node *node = document.GetDocumentNode(); node; node = Next(node)) {
    const ElementNode *element = Tarvel::Xml::AsElement(node);
    for (const auto *attribute = element ? element->GetFirstAttribute() : nullptr; attribute;
         attribute = attribute->GetNext()) {
      if (attribute->IsNamespaceDeclaration() &&
          attribute->GetValue().find_first_of("&<\"\t\r\n") != std::string_view::npos) {
        return true;
      }
    }
  }
  return false;
}

/// The element number `part` of the document; the document when `part` is 0 or above the number of elements.
const Node &PartOf(const Document &document, std::size_t part) {
  std::size_t elements = 0;
  for (const Node *node = document.GetDocumentNode(); node; node = Next(node)) {
    if (Tarvel::Xml::AsElement(node) && ++elements == part) {
      return *node;
    }
  }
  return *document.GetDocumentNode();
}

std::vector<std::string> PrefixListOf(const Choice &choice) {
  return choice.hasPrefixList ? std::vector<std::string>{"a", "#default", "b"} : std::vector<std::string>();
}

std::optional<std::string> OurForm(const Document &document, const Choice &choice) {
  const std::string_view uri = ALGORITHMS[(choice.isExclusive ? 2 : 0) + (choice.withComments ? 1 : 0)];
  const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  try {
    Tarvel::Xml::Security::CreateCanonicalizer(uri, PrefixListOf(choice))
        ->Canonicalize(PartOf(document, choice.part), *writer);
  } catch (const Tarvel::Xml::Security::XmlSecurityException &) {
    return std::nullopt;
  }
  return writer->TakeText();
}

std::optional<std::string> FormByExpat(const Document &document, std::string_view text, const Choice &choice) {
  const bool isPart = &PartOf(document, choice.part) != document.GetDocumentNode();
  return Testing::CanonicalFormByExpat(text, isPart ? choice.part - 1 : Testing::NO_ELEMENT, Testing::NO_ELEMENT,
                                       {choice.isExclusive, choice.withComments, PrefixListOf(choice)});
}

const xmlNode *Next(const xmlNode *node) {
  if (node->children) {
    return node->children;
  }
  while (node && !node->next) {
    node = node->parent;
  }
  return node ? node->next : nullptr;
}

const xmlNode *PartOf(const xmlDoc &document, std::size_t part) {
  std::size_t elements = 0;
  for (const xmlNode *node = document.children; node; node = Next(node)) {
    if (node->type == XML_ELEMENT_NODE && ++elements == part) {
      return node;
    }
  }
  return nullptr;
}

int IsInPart(void *apex, xmlNode *node, xmlNode *parent) {
  const bool belongsToElement = node->type == XML_ATTRIBUTE_NODE || node->type == XML_NAMESPACE_DECL;
  const xmlNode *above = belongsToElement ? parent : node;
  while (above && above != apex) {
    above = above->parent;
  }
  return above ? 1 : 0;
}

void SayNothing(void *, const char *, ...) {}

std::optional<std::string> TheirForm(std::string_view text, const Choice &choice) {
  xmlSetGenericErrorFunc(nullptr, SayNothing);
  const std::unique_ptr<xmlDoc, void (*)(xmlDoc *)> document(
      xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr,
                    XML_PARSE_NONET | XML_PARSE_NOENT | XML_PARSE_HUGE | XML_PARSE_NOERROR | XML_PARSE_NOWARNING),
      xmlFreeDoc);
  if (!document) {
    return std::nullopt;
  }
  std::vector<std::string> names = PrefixListOf(choice);
  std::vector<xmlChar *> prefixes;
  for (std::string &name : names) {
    prefixes.push_back(reinterpret_cast<xmlChar *>(name.data()));
  }
  prefixes.push_back(nullptr);
  const xmlNode *const apex = PartOf(*document, choice.part);
  xmlOutputBuffer *const buffer = xmlAllocOutputBuffer(nullptr);
  const int outcome = xmlC14NExecute(document.get(), apex ? IsInPart : nullptr, const_cast<xmlNode *>(apex),
                                     choice.isExclusive ? XML_C14N_EXCLUSIVE_1_0 : XML_C14N_1_0,
                                     names.empty() ? nullptr : prefixes.data(), choice.withComments ? 1 : 0, buffer);
  std::string form(reinterpret_cast<const char *>(xmlOutputBufferGetContent(buffer)), xmlOutputBufferGetSize(buffer));
  xmlOutputBufferClose(buffer);
  return outcome < 0 ? std::nullopt : std::optional<std::string>(std::move(form));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size < 2) {
    return 0;
  }
  const Choice choice = Choose(data[0]);
  const std::string text(reinterpret_cast<const char *>(data) + 1, size - 1);
  Ref<Document> document;
  try {
    const Ref<Tarvel::Object> result =
        Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*Tarvel::CreateStringReader(text));
    document = Ref<Document>(&dynamic_cast<Document &>(*result));
  } catch (const Tarvel::Xml::XMLParseException &) {
    return 0;
  }
  const std::optional<std::string> ours = OurForm(*document, choice);
  if (!ours) {
    return 0;
  }
  const std::optional<std::string> byExpat = FormByExpat(*document, text, choice);
  Require(!byExpat || *byExpat == *ours);
  if (HasNamespaceNameToEscape(*document)) {
    return 0;
  }
  const std::optional<std::string> theirs = TheirForm(text, choice);
  Require(!theirs || *theirs == *ours);
  return 0;
}
