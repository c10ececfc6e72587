// SPDX-License-Identifier: Apache-2.0

#include "exchange/soap_fault.h"

#include "model/namespaces.h"
#include "xml/tree_walk.h"
#include "xml/xml_text.h"

#include <algorithm>
#include <iterator>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::AsText;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::TextNode;

constexpr std::string_view WHITE_SPACE = " \t\r\n";

/// The names of elements with content that is never shown. Names that begin with "Signature" are secret, too.
constexpr std::string_view SECRET_ELEMENTS[] = {"Assertion",    "EncryptedData",       "EncryptedAssertion",
                                                "CipherValue",  "BinarySecurityToken", "BinaryExchange",
                                                "BinarySecret", "DigestValue",         "Password"};

std::string_view TextOf(const ElementNode *element) noexcept {
  const TextNode *const text = GetTextNode(element);
  return text ? text->GetValue() : std::string_view();
}

/// The namespace of a code, by the same rules as in `CheckSoapFault`.
std::string_view NamespaceOf(const ElementNode *element, std::string_view code) noexcept {
  const std::size_t colon = code.find(':');
  if (colon == std::string_view::npos) {
    return code.empty() ? std::string_view() : Namespaces::SOAPENV;
  }
  std::string_view namespaceUri;
  element->LookupNamespace(code.substr(0, colon), namespaceUri);
  return namespaceUri;
}

std::string_view Trim(std::string_view text) noexcept {
  const std::size_t first = text.find_first_not_of(WHITE_SPACE);
  return first == std::string_view::npos ? std::string_view()
                                         : text.substr(first, text.find_last_not_of(WHITE_SPACE) - first + 1);
}

/// The texts below `element`, except those of secret elements.
std::string ShownTexts(const ElementNode &element) {
  std::string texts;
  const Node *node = &element;
  while (node) {
    const ElementNode *const inner = AsElement(node);
    const TextNode *const text = AsText(node);
    const std::string_view value = Trim(text ? text->GetValue() : std::string_view());
    if (!value.empty()) {
      texts.append(texts.empty() ? "" : " ").append(value);
    }
    node = NextInTree(node, &element, inner && !IsSecretElement(inner->GetLocalName()));
  }
  return texts;
}

} // namespace

SoapFault ReadSoapFault(const ElementNode &fault) {
  const ElementNode *const codeElement = fault.FindChildElement("faultcode");
  const std::string_view code = TextOf(codeElement);
  const ElementNode *const detail = fault.FindChildElement("detail");
  return {code, NamespaceOf(codeElement, code), TextOf(fault.FindChildElement("faultstring")),
          detail ? ShownTexts(*detail) : std::string()};
}

bool IsSecretElement(std::string_view localName) noexcept {
  return localName.starts_with("Signature") ||
         std::find(std::begin(SECRET_ELEMENTS), std::end(SECRET_ELEMENTS), localName) != std::end(SECRET_ELEMENTS);
}

} // namespace SsoClient
