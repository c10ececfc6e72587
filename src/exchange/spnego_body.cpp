// SPDX-License-Identifier: Apache-2.0

#include "exchange/spnego_body.h"

#include "compose/ws_trust.h"

#include <tarvel/core/string_util.h>

namespace SsoClient {

XMLBodyBuilderInitialSPNego::XMLBodyBuilderInitialSPNego(SamlToken::ConfirmationType confirmation,
                                                         const TokenSpec &spec, const std::vector<std::uint8_t> &leg,
                                                         const ServiceDialect &dialect,
                                                         const Tarvel::Crypto::Certificate *certificate)
    : m_confirmation(confirmation), m_spec(spec), m_leg(leg), m_dialect(dialect), m_certificate(certificate) {}

void XMLBodyBuilderInitialSPNego::build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const {
  XMLCompositeBuilder request(AcquireSecurityTokenBuilder(m_confirmation, m_spec, m_dialect, m_certificate));
  request.Add(WstSPNegoBinExchangeBuilder(m_leg));
  request.build(out);
  out->DefineAttribute("Context", "urn:uuid:" + Tarvel::StringUtil::GenerateUuid());
}

XMLBodyBuilderContinuedSPNego::XMLBodyBuilderContinuedSPNego(const std::string &contextId,
                                                             const std::vector<std::uint8_t> &leg)
    : m_contextId(contextId), m_leg(leg) {}

void XMLBodyBuilderContinuedSPNego::build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const {
  // The body of the envelope declares the prefix.
  XMLCompositeBuilder response(ElementBuilder("wst", "RequestSecurityTokenResponse"));
  response.Add(WstSPNegoBinExchangeBuilder(m_leg));
  response.build(out);
  out->DefineAttribute("Context", m_contextId);
}

} // namespace SsoClient
