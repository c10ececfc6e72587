// SPDX-License-Identifier: Apache-2.0
/// @file
/// The SOAP 1.1 envelope of a request, plain or signed.

#pragma once

#include "compose/xml_builder.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <string>

namespace SsoClient {

/// The envelope around `header` and `body`; where one is null, its element stays empty.
XMLBuilderPtr SoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body);

/// An envelope whose body and timestamp are signed when it is built. Each build signs anew.
class XMLSignedSoapBuilder final : public XMLBaseBuilder {
public:
  /// @param header the `wsse:Security` element with its timestamp, which receives the signature
  /// @param privateKey not owned: it must live as long as the builder
  /// @param keyInfo the reference that tells which key signed; null for none
  XMLSignedSoapBuilder(XMLBuilderPtr header, XMLBuilderPtr body, const Tarvel::Crypto::PrivateKey *privateKey,
                       XMLBuilderPtr keyInfo);

  /// @throws what `SignSoapMessage` throws.
  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  XMLBuilderPtr m_header;
  XMLBuilderPtr m_body;
  const Tarvel::Crypto::PrivateKey *m_privateKey;
  XMLBuilderPtr m_keyInfo;
};

/// A signed envelope that carries `certificate` behind the header's tokens, and whose signature points at it.
/// @param privateKey not owned: it must live as long as the builder
XMLBuilderPtr CertRefSignedSoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                       const Tarvel::Crypto::PrivateKey *privateKey,
                                       const Tarvel::Crypto::Certificate *certificate);

/// A signed envelope whose signature points at the SAML assertion of that identifier, which the header already holds.
/// @param privateKey not owned: it must live as long as the builder
XMLBuilderPtr SamlRefSignedSoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                       const Tarvel::Crypto::PrivateKey *privateKey, const std::string &assertionId);

} // namespace SsoClient
