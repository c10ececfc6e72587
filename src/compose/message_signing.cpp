// SPDX-License-Identifier: Apache-2.0

#include "compose/message_signing.h"

#include "compose/wire_names.h"
#include "model/namespaces.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/canonicalizer.h>

#include <string_view>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::QName;
namespace Security = Tarvel::Xml::Security;

ElementNode *FindChild(ElementNode *parent, std::string_view namespaceUri, const char *localName) {
  return parent->FindChildElement(QName(std::string(namespaceUri), localName));
}

ElementNode *RequireChild(ElementNode *parent, std::string_view namespaceUri, const char *localName) {
  ElementNode *const child = FindChild(parent, namespaceUri, localName);
  if (!child) {
    throw Tarvel::InvalidArgumentException("the message to sign has no element '" + std::string(localName) + "' in '" +
                                           std::string(parent->GetName()) + "'");
  }
  return child;
}

/// Adds references to the elements of WS-Addressing in the header, in their order.
void AddAddressingToSignature(Security::Signature &signature, ElementNode *header) {
  for (Node *child = header->GetFirstChild(); child; child = child->GetNextSibling()) {
    ElementNode *const element = AsElement(child);
    if (element && element->HasQName(Namespaces::WSA, element->GetLocalName())) {
      AddElementToSignature(signature, element);
    }
  }
}

} // namespace

void SignSoapMessage(const Tarvel::Crypto::PrivateKey &privateKey, const XMLBuilderPtr &keyInfo,
                     const Tarvel::Ref<ElementNode> &envelope) {
  ElementNode *const body = RequireChild(envelope.get(), Namespaces::SOAPENV, "Body");
  ElementNode *const header = RequireChild(envelope.get(), Namespaces::SOAPENV, "Header");
  ElementNode *const security = RequireChild(header, Namespaces::WSSE, "Security");
  ElementNode *const timestamp = FindChild(security, Namespaces::WSU, "Timestamp");

  Tarvel::Ref<Security::Signature> signature;
  Security::CreateBlankSignature(envelope, Security::CanonicalizationUri::EXCLUSIVE, Security::SignatureUri::RSA_SHA256,
                                 "ds", signature);
  AddElementToSignature(*signature, body);
  if (timestamp) {
    AddElementToSignature(*signature, timestamp);
  }
  AddAddressingToSignature(*signature, header);
  if (keyInfo) {
    Tarvel::Ref<ElementNode> content;
    keyInfo->build(content);
    signature->SetKeyInfo(content);
  }
  signature->Sign(privateKey);

  const Tarvel::Ref<ElementNode> element = signature->GetElement();
  element->DefineAttribute("Id", WireNames::HOLDER_OF_KEY_SIGNATURE_ID);
  security->AppendChild(element.get());
}

std::string CreateWssuId(ElementNode *element) {
  if (const auto *const existing = element->FindAttribute(Namespaces::WSU, "Id")) {
    return std::string(existing->GetValue());
  }
  std::string id = std::string(element->GetLocalName()) + Tarvel::StringUtil::GenerateUuid();
  element->DefineAttribute("xmlns:wsu", Namespaces::WSU);
  element->DefineAttribute("wsu:Id", id);
  return id;
}

void AddElementToSignature(Security::Signature &signature, ElementNode *element) {
  signature.AddReference("#" + CreateWssuId(element), Security::SignatureUri::DIGEST_SHA256,
                         Security::CanonicalizationUri::EXCLUSIVE);
}

} // namespace SsoClient
