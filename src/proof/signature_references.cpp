// SPDX-License-Identifier: Apache-2.0

#include "proof/signature_references.h"

#include "model/namespaces.h"

#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>
#include <cstddef>
#include <iterator>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
namespace Canonicalization = Tarvel::Xml::Security::CanonicalizationUri;

/// Transforms that select nothing outside of their input.
constexpr std::string_view HARMLESS_TRANSFORMS[] = {
    Tarvel::Xml::Security::SignatureUri::ENVELOPED_SIGNATURE,
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-soap-message-security-1.0#STR-Transform",
};

constexpr std::string_view INCLUSIVE_FORMS[] = {
    Canonicalization::INCLUSIVE,
    Canonicalization::INCLUSIVE_WITH_COMMENTS,
    "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#",
    "http://www.w3.org/2006/12/xml-c14n11",
    "http://www.w3.org/2006/12/xml-c14n11#WithComments",
};

template <std::size_t COUNT>
bool Contains(const std::string_view (&list)[COUNT], std::string_view uri) noexcept {
  return std::find(std::begin(list), std::end(list), uri) != std::end(list);
}

std::string_view AlgorithmOf(const ElementNode &element) noexcept {
  const Attribute *const algorithm = element.FindAttribute(std::string_view(), "Algorithm");
  return algorithm ? algorithm->GetValue() : std::string_view();
}

bool IsExclusive(std::string_view uri) noexcept {
  return uri == Canonicalization::EXCLUSIVE || uri == Canonicalization::EXCLUSIVE_WITH_COMMENTS;
}

/// The PrefixList of the exclusive canonicalisation that `method` states; empty if it has none.
std::string_view PrefixListOf(const ElementNode &method) noexcept {
  for (const Node *node = method.GetFirstChild(); node; node = node->GetNextSibling()) {
    const ElementNode *const element = AsElement(node);
    if (element && element->HasQName(Canonicalization::EXCLUSIVE, "InclusiveNamespaces")) {
      const Attribute *const list = element->FindAttribute(std::string_view(), "PrefixList");
      return list ? list->GetValue() : std::string_view();
    }
  }
  return {};
}

void ReadTransform(const ElementNode &transform, SignatureReference &reference) noexcept {
  const std::string_view algorithm = AlgorithmOf(transform);
  if (IsExclusive(algorithm) || Contains(INCLUSIVE_FORMS, algorithm)) {
    reference.context = ReadCanonicalizationMethod(transform);
  } else if (!Contains(HARMLESS_TRANSFORMS, algorithm)) {
    reference.isTransformed = true;
  }
}

} // namespace

bool ContextOfForm::Includes(std::string_view prefix) const noexcept {
  bool isIncluded = isInclusive;
  ForEachPrefix(prefixList, [&](std::string_view included) {
    isIncluded = isIncluded || included == prefix;
    return !isIncluded;
  });
  return isIncluded;
}

std::string_view SignatureReference::GetIdentifier() const noexcept {
  const std::string_view value = uri ? uri->GetValue() : std::string_view();
  const bool isIdentifier = value.size() > 1 && value.front() == '#' && value.find('(') == std::string_view::npos;
  return isIdentifier ? value.substr(1) : std::string_view();
}

SignatureReference ReadSignatureReference(const ElementNode &reference) noexcept {
  SignatureReference read;
  read.element = &reference;
  read.uri = reference.FindAttribute(std::string_view(), "URI");
  read.context.isInclusive = true;
  for (const Node *node = reference.GetFirstChild(); node; node = node->GetNextSibling()) {
    const ElementNode *const transforms = AsElement(node);
    if (!transforms || !transforms->HasQName(Namespaces::DS, "Transforms")) {
      continue;
    }
    for (const Node *child = transforms->GetFirstChild(); child; child = child->GetNextSibling()) {
      if (const ElementNode *const transform = AsElement(child)) {
        ReadTransform(*transform, read);
      }
    }
  }
  return read;
}

ContextOfForm ReadCanonicalizationMethod(const ElementNode &method) noexcept {
  ContextOfForm context;
  context.isInclusive = !IsExclusive(AlgorithmOf(method));
  context.prefixList = context.isInclusive ? std::string_view() : PrefixListOf(method);
  return context;
}

} // namespace SsoClient
