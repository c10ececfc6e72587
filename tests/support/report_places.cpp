// SPDX-License-Identifier: Apache-2.0

#include "support/report_places.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/document.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <utility>

namespace Testing {

using namespace SsoClient;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

namespace {

using Position = std::pair<std::uint32_t, std::uint32_t>; // line and column

const Node *NextInDocumentOrder(const Node *node) {
  if (node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node ? node->GetNextSibling() : nullptr;
}

std::map<Position, const ElementNode *> ElementsByPosition(const Tarvel::Xml::Document &document) {
  std::map<Position, const ElementNode *> elements;
  for (const Node *node = document.GetDocumentElement(); node; node = NextInDocumentOrder(node)) {
    if (const ElementNode *const element = Tarvel::Xml::AsElement(node)) {
      elements[{element->GetLine(), element->GetColumn()}] = element;
    }
  }
  return elements;
}

std::string Shown(std::string_view text) {
  return Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text));
}

/// "[n]" for the n-th element of its name under its parent, if n > 1; "[?]" after more than a thousand other nodes.
std::string NumberOf(const ElementNode &element) {
  constexpr std::size_t MAX_NODES_BEFORE = 1000;
  std::size_t number = 1;
  std::size_t nodes = 0;
  for (const Node *node = element.GetParent()->GetFirstChild(); node != &element; node = node->GetNextSibling()) {
    const ElementNode *const sibling = Tarvel::Xml::AsElement(node);
    number += sibling && sibling->GetName() == element.GetName() ? 1u : 0u;
    ++nodes;
  }
  return nodes > MAX_NODES_BEFORE ? "[?]" : number > 1 ? "[" + std::to_string(number) + "]" : "";
}

/// The path of `element`: the names and numbers of the elements from the document element to it.
std::string PathTo(const ElementNode *element) {
  std::string path;
  for (; element; element = Tarvel::Xml::AsElement(element->GetParent())) {
    path.insert(0, "/" + std::string(element->GetName()) + NumberOf(*element));
  }
  return path;
}

/// The beginning of a long path may be left out.
bool IsRight(const std::string &shown, const std::string &path) {
  const std::string cut = "/...";
  return shown == Shown(path) || (path.size() > 512 && shown.compare(0, cut.size(), cut) == 0 &&
                                  path.find(shown.substr(cut.size(), 100)) != std::string::npos);
}

std::string JudgePlace(const TokenReport::Finding &finding,
                       const std::map<Position, const ElementNode *> &elementsByPosition) {
  if (finding.element.empty()) {
    return finding.attribute.empty() && finding.path.empty() && finding.line == 0 && finding.column == 0
               ? ""
               : "a finding without element has a place";
  }
  const auto found = elementsByPosition.find({finding.line, finding.column});
  if (found == elementsByPosition.end()) {
    return "no element begins at the line and column";
  }
  if (finding.element != Shown(found->second->GetName())) {
    return "another element begins at the line and column: " + std::string(found->second->GetName());
  }
  const std::string path = PathTo(found->second);
  return IsRight(finding.path, path) ? "" : "the path should be " + path;
}

} // namespace

std::string FindWrongPlaces(const TokenReport &report, const Tarvel::Xml::Document &document) {
  constexpr std::size_t ENOUGH = 20; // findings of each check; reports of hostile documents have a thousand
  std::map<Position, const ElementNode *> elements;
  std::string wrong;
  for (const TokenReport::CheckResult &result : report.checks) {
    for (std::size_t i = 0; i < result.findings.size() && i < ENOUGH; ++i) {
      if (elements.empty()) {
        elements = ElementsByPosition(document);
      }
      const std::string complaint = JudgePlace(result.findings[i], elements);
      if (!complaint.empty()) {
        wrong += "finding \"" + result.findings[i].message + "\": " + complaint + '\n';
      }
    }
  }
  return wrong;
}

} // namespace Testing
