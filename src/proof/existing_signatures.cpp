// SPDX-License-Identifier: Apache-2.0

#include "proof/existing_signatures.h"

#include "model/namespaces.h"
#include "proof/soap_parts.h"
#include "xml/tree_walk.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <map>

namespace SsoClient {

namespace {

using Tarvel::MessageFormatter;
using Tarvel::StringUtil;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

/// The elements that an identifier refers to.
struct Target {
  const ElementNode *first = nullptr;
  bool isUnique = false;
};

[[noreturn]] void RefuseUnknownCover(const SignatureReference &reference) {
  const std::string text = "A signature in the message may cover the security header: ";
  if (!reference.uri) {
    throw InvalidMessageException(text + "it has a reference without a URI");
  }
  throw InvalidMessageException(text + "its reference \"" + StringUtil::Shorten(reference.uri->GetValue()) +
                                (reference.isTransformed ? "\" has a transform that can select other content"
                                                         : "\" does not refer to exactly one element"));
}

bool IsInside(const Node *node, const ElementNode &element) noexcept {
  while (node && node != &element) {
    node = node->GetParent();
  }
  return node;
}

void RequireFormIndependence(const ElementNode *apex, const ContextOfForm &context, const ElementNode &element,
                             std::string_view prefix) {
  if (context.Includes(prefix) && IsInside(apex, element)) {
    throw InvalidMessageException(MessageFormatter::ASPrint(
        "The element '%1' cannot get an identifier: a signature in it depends on the namespaces around it. Give the "
        "element a wsu:Id before the signature is made",
        StringUtil::Shorten(element.GetName())));
  }
}

} // namespace

ExistingSignatures::ExistingSignatures(const ElementNode &envelope,
                                       const std::set<std::string, std::less<>> &newIdentifiers) {
  FindReferences(envelope);
  ResolveReferences(envelope, newIdentifiers);
}

void ExistingSignatures::FindReferences(const ElementNode &envelope) {
  for (const Node *node = &envelope; node; node = NextInTree(node, &envelope)) {
    const ElementNode *const element = AsElement(node);
    if (!element) {
      continue;
    }
    if (element->HasQName(Namespaces::DS, "Reference")) {
      m_covered.push_back({ReadSignatureReference(*element)});
    } else if (element->HasQName(Namespaces::DS, "CanonicalizationMethod")) {
      m_signedInfos.push_back({AsElement(element->GetParent()), ReadCanonicalizationMethod(*element)});
    }
  }
}

void ExistingSignatures::ResolveReferences(const ElementNode &envelope,
                                           const std::set<std::string, std::less<>> &newIdentifiers) {
  std::map<std::string_view, Target> targets;
  for (const CoveredElement &covered : m_covered) {
    targets.try_emplace(covered.reference.GetIdentifier());
  }
  for (const Node *node = &envelope; node; node = NextInTree(node, &envelope)) {
    const ElementNode *const element = AsElement(node);
    for (const Attribute *attribute = element ? element->GetFirstAttribute() : nullptr; attribute;
         attribute = attribute->GetNext()) {
      if (!IsIdentifier(*attribute, *element)) {
        continue;
      }
      if (newIdentifiers.count(attribute->GetValue()) > 0) {
        throw InvalidMessageException(
            MessageFormatter::ASPrint("The message already has an element with the identifier '%1' of the token",
                                      StringUtil::Shorten(attribute->GetValue())));
      }
      const auto found = targets.find(attribute->GetValue());
      if (found != targets.end()) {
        Target &target = found->second;
        target.isUnique = !target.first || (target.isUnique && target.first == element);
        target.first = element;
      }
    }
  }
  for (CoveredElement &covered : m_covered) {
    const Target &target = targets[covered.reference.GetIdentifier()];
    covered.target = target.isUnique ? target.first : nullptr;
  }
}

void ExistingSignatures::RequireUncovered(const std::vector<const ElementNode *> &elements) const {
  for (const CoveredElement &covered : m_covered) {
    if (covered.reference.uri && covered.reference.uri->GetValue().empty()) {
      throw InvalidMessageException("A signature in the message covers the whole message, and would not be valid after "
                                    "a change of the security header");
    }
    if (!covered.target || covered.reference.GetIdentifier().empty() || covered.reference.isTransformed) {
      RefuseUnknownCover(covered.reference);
    }
    if (std::find(elements.begin(), elements.end(), covered.target) != elements.end()) {
      throw InvalidMessageException(MessageFormatter::ASPrint(
          "A signature in the message covers the element '%1', and would not be valid after a change of the security "
          "header",
          StringUtil::Shorten(covered.target->GetName())));
    }
  }
}

void ExistingSignatures::RequireIndependence(const ElementNode &element, std::string_view prefix) const {
  for (const CoveredElement &covered : m_covered) {
    RequireFormIndependence(covered.target, covered.reference.context, element, prefix);
  }
  for (const SignedForm &form : m_signedInfos) {
    RequireFormIndependence(form.apex, form.context, element, prefix);
  }
}

} // namespace SsoClient
