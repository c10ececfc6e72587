// SPDX-License-Identifier: Apache-2.0
/// @file
/// The XML signature of a message: of a request to the token service, or of any elements of an envelope.

#pragma once

#include "compose/xml_builder.h"

#include <tarvel/core/ref.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

/// Signs the body of the envelope and, if it has them, its timestamp and its header elements of WS-Addressing. Appends
/// the signature to `wsse:Security`.
/// @param keyInfo builds the content of the signature's `ds:KeyInfo`; null for none
/// @throws Tarvel::InvalidArgumentException when the envelope has no body, header or security element.
/// @throws Tarvel::Xml::Security::XmlSecurityException when the key cannot sign.
void SignSoapMessage(const Tarvel::Crypto::PrivateKey &privateKey, const XMLBuilderPtr &keyInfo,
                     const Tarvel::Ref<Tarvel::Xml::ElementNode> &envelope);

/// A signature over the elements of the tree of `root` that have these identifiers, in this order. Returns its element, which
/// has no parent: add it to the tree.
/// @param signatureUri the algorithm, which must be for keys like `privateKey`
/// @param keyInfo builds the content of the signature's `ds:KeyInfo`; null for none
/// @throws Tarvel::Xml::Security::XmlSecurityException when the key cannot sign, or not exactly one element of the tree has
///         one of the identifiers. The tree is not changed.
Tarvel::Ref<Tarvel::Xml::ElementNode> SignIdentifiedElements(const Tarvel::Ref<Tarvel::Xml::ElementNode> &root,
                                                             const std::vector<std::string> &identifiers,
                                                             std::string_view signatureUri,
                                                             const XMLBuilderPtr &keyInfo,
                                                             const Tarvel::Crypto::PrivateKey &privateKey);

/// The `wsu:Id` of the element. If it has none, it gets one that consists of its local name and a new UUID. The attribute, and
/// the declaration of its prefix where it needs one, are the last attributes of the element.
std::string CreateWssuId(Tarvel::Xml::ElementNode *element);

/// Adds a reference to `element`, by its `wsu:Id`, to the signature.
void AddElementToSignature(Tarvel::Xml::Security::Signature &signature, Tarvel::Xml::ElementNode *element);

} // namespace SsoClient
