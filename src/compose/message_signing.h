// SPDX-License-Identifier: Apache-2.0
/// @file
/// The XML signature of an envelope: of its body, its timestamp and its addresses.

#pragma once

#include "compose/xml_builder.h"

#include <tarvel/core/ref.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

#include <string>

namespace SsoClient {

/// Signs the body of the envelope, then its timestamp and its header elements of WS-Addressing, if it has any. Appends the
/// signature to `wsse:Security`.
/// @param keyInfo builds the content of the signature's `ds:KeyInfo`; null for none
/// @throws Tarvel::InvalidArgumentException when the envelope has no body, header or security element.
/// @throws Tarvel::Xml::Security::XmlSecurityException when the key cannot sign.
void SignSoapMessage(const Tarvel::Crypto::PrivateKey &privateKey, const XMLBuilderPtr &keyInfo,
                     const Tarvel::Ref<Tarvel::Xml::ElementNode> &envelope);

/// The `wsu:Id` of the element. If it has none, it gets one that consists of its local name and a new UUID.
std::string CreateWssuId(Tarvel::Xml::ElementNode *element);

/// Adds a reference to `element`, by its `wsu:Id`, to the signature.
void AddElementToSignature(Tarvel::Xml::Security::Signature &signature, Tarvel::Xml::ElementNode *element);

} // namespace SsoClient
