// SPDX-License-Identifier: Apache-2.0
/// @file
/// The request bodies of the legs of an SPNEGO negotiation.

#pragma once

#include "compose/xml_builder.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/service_dialect.h>
#include <ssoclient/token_spec.h>
#include <tarvel/crypto/certificate.h>

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// The first leg: an issue request whose last element is the leg. Each build writes a new `Context`: "urn:uuid:" and a
/// UUID.
class XMLBodyBuilderInitialSPNego final : public XMLBaseBuilder {
public:
  /// @param certificate see `AcquireSecurityTokenBuilder`. Not owned: it must live as long as the builder.
  XMLBodyBuilderInitialSPNego(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                              const std::vector<std::uint8_t> &leg, const ServiceDialect &dialect = {},
                              const Tarvel::Crypto::Certificate *certificate = nullptr);

  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  SamlToken::ConfirmationType m_confirmation;
  TokenSpec m_spec;
  std::vector<std::uint8_t> m_leg;
  ServiceDialect m_dialect;
  const Tarvel::Crypto::Certificate *m_certificate;
};

/// A further leg: a response element with the `Context` that the service has chosen for the negotiation.
class XMLBodyBuilderContinuedSPNego final : public XMLBaseBuilder {
public:
  XMLBodyBuilderContinuedSPNego(const std::string &contextId, const std::vector<std::uint8_t> &leg);

  void build(Tarvel::Ref<Tarvel::Xml::ElementNode> &out) const override;

private:
  std::string m_contextId;
  std::vector<std::uint8_t> m_leg;
};

} // namespace SsoClient
