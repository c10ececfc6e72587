// SPDX-License-Identifier: Apache-2.0

#include "compose/soap_envelope.h"

#include "compose/message_signing.h"
#include "compose/wire_names.h"
#include "compose/ws_security.h"
#include "model/namespaces.h"

#include <utility>

namespace SsoClient {

XMLBuilderPtr SoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body, const HeaderBuilders &more) {
  auto soapHeader = std::make_shared<XMLCompositeBuilder>(ElementBuilder("soapenv", "Header"));
  soapHeader->Add(header);
  for (const XMLBuilderPtr &element : more) {
    soapHeader->Add(element);
  }
  // Some services look for the declaration of the WS-Trust namespace on the body, so it is here as well as on the request.
  auto soapBody = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("soapenv", "Body", {{"xmlns:wst", std::string(Namespaces::WST)}}));
  soapBody->Add(body);
  auto envelope = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder("soapenv", "Envelope", {{"xmlns:soapenv", std::string(Namespaces::SOAPENV)}}));
  envelope->Add(soapHeader).Add(soapBody);
  return envelope;
}

XMLSignedSoapBuilder::XMLSignedSoapBuilder(XMLBuilderPtr header, XMLBuilderPtr body,
                                           const Tarvel::Crypto::PrivateKey *privateKey, XMLBuilderPtr keyInfo,
                                           HeaderBuilders more)
    : m_header(std::move(header)), m_body(std::move(body)), m_privateKey(privateKey), m_keyInfo(std::move(keyInfo)),
      m_more(std::move(more)) {}

void XMLSignedSoapBuilder::build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const {
  SoapBuilder(m_header, m_body, m_more)->build(out);
  SignSoapMessage(*m_privateKey, m_keyInfo, out);
}

XMLBuilderPtr CertRefSignedSoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                       const Tarvel::Crypto::PrivateKey *privateKey,
                                       const Tarvel::Crypto::Certificate *certificate, const HeaderBuilders &more) {
  const std::string id(WireNames::HOLDER_OF_KEY_CERTIFICATE_ID);
  auto headerWithCertificate = std::make_shared<XMLCompositeBuilder>(header);
  headerWithCertificate->Add(WsseX509v3BinarySecTokenBuilder(id, certificate));
  return std::make_shared<const XMLSignedSoapBuilder>(headerWithCertificate, body, privateKey,
                                                      WsseX509v3BSTReferenceBuilder(id), more);
}

XMLBuilderPtr SamlRefSignedSoapBuilder(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                       const Tarvel::Crypto::PrivateKey *privateKey, const std::string &assertionId,
                                       const ServiceDialect &dialect, const HeaderBuilders &more) {
  return std::make_shared<const XMLSignedSoapBuilder>(header, body, privateKey,
                                                      WsseSamlKeyIdReferenceBuilder(assertionId, dialect), more);
}

} // namespace SsoClient
