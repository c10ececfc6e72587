// SPDX-License-Identifier: Apache-2.0
/// @file
/// The SOAP 1.1 envelope of a request, plain or signed.

#pragma once

#include "compose/xml_builder.h"

#include <ssoclient/service_dialect.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <string>
#include <vector>

namespace SsoClient {

/// The elements of an envelope's header after `wsse:Security`.
using HeaderBuilders = std::vector<XMLBuilderPtr>;

/// An envelope: `header` and `more` are in its header, `body` is in its body. A builder that is null adds nothing.
XMLBuilderPtr SoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body, const HeaderBuilders &more = {});

/// An envelope whose body, timestamp and header elements of WS-Addressing are signed when it is built. Each build makes a
/// new signature.
class XMLSignedSoapBuilder final : public XMLBaseBuilder {
public:
  /// @param header the `wsse:Security` element, which has the timestamp and receives the signature
  /// @param privateKey not owned: it must live as long as the builder
  /// @param keyInfo a reference to the key that signs; null for none
  XMLSignedSoapBuilder(XMLBuilderPtr header, XMLBuilderPtr body, const Tarvel::Crypto::PrivateKey *privateKey,
                       XMLBuilderPtr keyInfo, HeaderBuilders more = {});

  /// @throws what `SignSoapMessage` throws.
  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  XMLBuilderPtr m_header;
  XMLBuilderPtr m_body;
  const Tarvel::Crypto::PrivateKey *m_privateKey;
  XMLBuilderPtr m_keyInfo;
  HeaderBuilders m_more;
};

/// A signed envelope that contains `certificate` after the tokens of the header. The signature refers to the certificate.
/// @param privateKey not owned: it must live as long as the builder
XMLBuilderPtr CertRefSignedSoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                       const Tarvel::Crypto::PrivateKey *privateKey,
                                       const Tarvel::Crypto::Certificate *certificate, const HeaderBuilders &more = {});

/// A signed envelope whose signature refers to the SAML assertion with that identifier. `header` must contain the
/// assertion.
/// @param privateKey not owned: it must live as long as the builder
XMLBuilderPtr SamlRefSignedSoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                       const Tarvel::Crypto::PrivateKey *privateKey, const std::string &assertionId,
                                       const ServiceDialect &dialect = {}, const HeaderBuilders &more = {});

} // namespace SsoClient
