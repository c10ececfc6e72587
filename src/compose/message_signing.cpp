// SPDX-License-Identifier: Apache-2.0

#include "compose/message_signing.h"

#include "compose/bound_prefix.h"
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

/// Adds the identifiers of the elements of WS-Addressing in the header, in their order.
void AddAddressing(std::vector<std::string> &identifiers, ElementNode *header) {
  for (Node *child = header->GetFirstChild(); child; child = child->GetNextSibling()) {
    ElementNode *const element = AsElement(child);
    if (element && element->HasQName(Namespaces::WSA, element->GetLocalName())) {
      identifiers.push_back(CreateWssuId(element));
    }
  }
}

void AddReference(Security::Signature &signature, const std::string &identifier) {
  signature.AddReference("#" + identifier, Security::SignatureUri::DIGEST_SHA256,
                         Security::CanonicalizationUri::EXCLUSIVE);
}

} // namespace

void SignSoapMessage(const Tarvel::Crypto::PrivateKey &privateKey, const XMLBuilderPtr &keyInfo,
                     const Tarvel::Ref<ElementNode> &envelope) {
  ElementNode *const body = RequireChild(envelope.get(), Namespaces::SOAPENV, "Body");
  ElementNode *const header = RequireChild(envelope.get(), Namespaces::SOAPENV, "Header");
  ElementNode *const security = RequireChild(header, Namespaces::WSSE, "Security");
  ElementNode *const timestamp = FindChild(security, Namespaces::WSU, "Timestamp");

  std::vector<std::string> identifiers{CreateWssuId(body)};
  if (timestamp) {
    identifiers.push_back(CreateWssuId(timestamp));
  }
  AddAddressing(identifiers, header);
  const Tarvel::Ref<ElementNode> signature =
      SignIdentifiedElements(envelope, identifiers, Security::SignatureUri::RSA_SHA256, keyInfo, privateKey);
  signature->DefineAttribute("Id", WireNames::HOLDER_OF_KEY_SIGNATURE_ID);
  security->AppendChild(signature.get());
}

Tarvel::Ref<ElementNode> SignIdentifiedElements(const Tarvel::Ref<ElementNode> &root,
                                                const std::vector<std::string> &identifiers,
                                                std::string_view signatureUri, const XMLBuilderPtr &keyInfo,
                                                const Tarvel::Crypto::PrivateKey &privateKey) {
  Tarvel::Ref<Security::Signature> signature;
  Security::CreateBlankSignature(root, Security::CanonicalizationUri::EXCLUSIVE, signatureUri, "ds", signature);
  for (const std::string &identifier : identifiers) {
    AddReference(*signature, identifier);
  }
  if (keyInfo) {
    Tarvel::Ref<ElementNode> content;
    keyInfo->build(content);
    signature->SetKeyInfo(content);
  }
  signature->Sign(privateKey);
  return signature->GetElement();
}

std::string CreateWssuId(ElementNode *element) {
  if (const auto *const existing = element->FindAttribute(Namespaces::WSU, "Id")) {
    return std::string(existing->GetValue());
  }
  std::string id = std::string(element->GetLocalName()) + Tarvel::StringUtil::GenerateUuid();
  element->DefineAttribute(BindPrefix(*element, "wsu", Namespaces::WSU) + ":Id", id);
  return id;
}

void AddElementToSignature(Security::Signature &signature, ElementNode *element) {
  AddReference(signature, CreateWssuId(element));
}

} // namespace SsoClient
