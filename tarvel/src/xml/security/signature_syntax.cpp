// SPDX-License-Identifier: Apache-2.0

#include "xml/security/signature_syntax.h"

#include "xml/security/element_place.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>
#include <initializer_list>

namespace Tarvel::Xml::Security {

namespace {

constexpr std::string_view WHITE_SPACE = " \t\r\n";

[[noreturn]] void Fail(const std::string &what, const ElementNode &element) {
  throw SignatureSyntaxException(what + PlaceOf(element));
}

std::string Quote(std::string_view name) {
  return "\"" + StringUtil::Shorten(name) + "\"";
}

bool IsSignatureElement(const ElementNode &element, std::string_view localName) {
  return element.HasQName(SignatureUri::NAMESPACE, localName);
}

bool IsWhiteSpace(std::string_view text) {
  return text.find_first_not_of(WHITE_SPACE) == std::string_view::npos;
}

/// Steps through the child elements of an element. Apart from them it may contain only white space and comments.
class ChildElements {
public:
  explicit ChildElements(const ElementNode &parent) : m_parent(parent) { MoveTo(parent.GetFirstChild()); }

  /// The current element, or null at the end.
  const ElementNode *Current() const noexcept { return m_current; }
  void MoveOn() { MoveTo(m_current->GetNextSibling()); }

  /// Returns the current element and steps past it if it is the ds element of that name; otherwise returns null.
  const ElementNode *TakeIf(std::string_view localName) {
    const ElementNode *element = m_current;
    if (!element || !IsSignatureElement(*element, localName)) {
      return nullptr;
    }
    MoveOn();
    return element;
  }

  const ElementNode &Take(std::string_view localName) {
    if (const ElementNode *element = TakeIf(localName)) {
      return *element;
    }
    const std::string found = m_current ? "found " + Quote(m_current->GetName()) : "nothing follows";
    Fail("Expected ds:" + std::string(localName) + " in " + Quote(m_parent.GetName()) + ", but " + found,
         m_current ? *m_current : m_parent);
  }

  void RequireEnd() const {
    if (m_current) {
      Fail("Unexpected element " + Quote(m_current->GetName()) + " in " + Quote(m_parent.GetName()), *m_current);
    }
  }

private:
  void MoveTo(const Node *node) {
    for (; node && node->GetKind() != NodeKind::ELEMENT; node = node->GetNextSibling()) {
      const TextNode *text = AsText(node);
      if (node->GetKind() != NodeKind::COMMENT && !(text && IsWhiteSpace(text->GetValue()))) {
        Fail("Unexpected content in " + Quote(m_parent.GetName()), m_parent);
      }
    }
    m_current = AsElement(node);
  }

  const ElementNode &m_parent;
  const ElementNode *m_current = nullptr;
};

/// Refuses attributes other than `names`; namespace declarations are always allowed.
void RequireAttributesAmong(const ElementNode &element, std::initializer_list<std::string_view> names) {
  for (const Attribute *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    if (!attribute->IsNamespaceDeclaration() &&
        std::find(names.begin(), names.end(), attribute->GetName()) == names.end()) {
      Fail("Unexpected attribute " + Quote(attribute->GetName()) + " of " + Quote(element.GetName()), element);
    }
  }
}

std::string_view RequireAttribute(const ElementNode &element, std::string_view name) {
  const Attribute *attribute = element.FindAttribute(std::string_view(), name);
  if (!attribute) {
    Fail("The element " + Quote(element.GetName()) + " has no attribute " + Quote(name), element);
  }
  return attribute->GetValue();
}

std::vector<std::uint8_t> ReadBase64(const ElementNode &element) {
  const Node *child = element.GetFirstChild();
  const TextNode *text = AsText(child);
  if (!text || child->GetNextSibling() || IsWhiteSpace(text->GetValue())) {
    Fail("The element " + Quote(element.GetName()) + " must have text, and nothing else", element);
  }
  try {
    return StringUtil::Base64Decode(text->GetValue());
  } catch (const Base64FormatException &) {
    Fail("The text of " + Quote(element.GetName()) + " is not Base64", element);
  }
}

std::string_view ReadPrefixList(const ElementNode &element) {
  RequireAttributesAmong(element, {"PrefixList"});
  if (element.GetFirstChild()) {
    Fail("The element " + Quote(element.GetName()) + " must be empty", element);
  }
  return RequireAttribute(element, "PrefixList");
}

AlgorithmSyntax ReadAlgorithm(const ElementNode &element) {
  RequireAttributesAmong(element, {"Algorithm"});
  AlgorithmSyntax algorithm;
  algorithm.element = &element;
  algorithm.uri = RequireAttribute(element, "Algorithm");
  for (ChildElements children(element); children.Current(); children.MoveOn()) {
    const ElementNode &child = *children.Current();
    // The URI of exclusive canonicalisation is also the namespace of its parameter.
    if (!algorithm.prefixList && child.HasQName(CanonicalizationUri::EXCLUSIVE, "InclusiveNamespaces")) {
      algorithm.prefixList = ReadPrefixList(child);
    } else if (algorithm.otherParameter.empty()) {
      algorithm.otherParameter = child.GetName();
    }
  }
  return algorithm;
}

std::vector<AlgorithmSyntax> ReadTransforms(const ElementNode &element) {
  RequireAttributesAmong(element, {});
  std::vector<AlgorithmSyntax> transforms;
  ChildElements children(element);
  do {
    transforms.push_back(ReadAlgorithm(children.Take("Transform")));
  } while (children.Current());
  return transforms;
}

ReferenceSyntax ReadReference(const ElementNode &element) {
  RequireAttributesAmong(element, {"Id", "URI", "Type"});
  ReferenceSyntax reference;
  reference.element = &element;
  reference.uri = RequireAttribute(element, "URI");
  if (const Attribute *type = element.FindAttribute(std::string_view(), "Type")) {
    reference.type = type->GetValue();
  }
  ChildElements children(element);
  if (const ElementNode *transforms = children.TakeIf("Transforms")) {
    reference.transforms = ReadTransforms(*transforms);
  }
  reference.digestMethod = ReadAlgorithm(children.Take("DigestMethod"));
  const ElementNode &digestValue = children.Take("DigestValue");
  RequireAttributesAmong(digestValue, {});
  reference.digestValueElement = &digestValue;
  reference.digestValue = ReadBase64(digestValue);
  children.RequireEnd();
  return reference;
}

void ReadSignedInfo(const ElementNode &element, SignatureSyntax &syntax) {
  RequireAttributesAmong(element, {"Id"});
  syntax.signedInfo = &element;
  ChildElements children(element);
  syntax.canonicalizationMethod = ReadAlgorithm(children.Take("CanonicalizationMethod"));
  syntax.signatureMethod = ReadAlgorithm(children.Take("SignatureMethod"));
  while (const ElementNode *reference = children.TakeIf("Reference")) {
    syntax.references.push_back(ReadReference(*reference));
  }
  children.RequireEnd();
}

} // namespace

SignatureSyntax ReadSignatureSyntax(const ElementNode &signature) {
  if (!IsSignatureElement(signature, "Signature")) {
    Fail("Expected ds:Signature, found " + Quote(signature.GetName()), signature);
  }
  RequireAttributesAmong(signature, {"Id"});
  SignatureSyntax syntax;
  ChildElements children(signature);
  ReadSignedInfo(children.Take("SignedInfo"), syntax);
  const ElementNode &signatureValue = children.Take("SignatureValue");
  RequireAttributesAmong(signatureValue, {"Id"});
  syntax.signatureValueElement = &signatureValue;
  syntax.signatureValue = ReadBase64(signatureValue);
  syntax.keyInfo = children.TakeIf("KeyInfo");
  while (const ElementNode *object = children.TakeIf("Object")) {
    syntax.object = syntax.object ? syntax.object : object;
  }
  children.RequireEnd();
  return syntax;
}

} // namespace Tarvel::Xml::Security
