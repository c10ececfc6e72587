// SPDX-License-Identifier: Apache-2.0

#include "integration/gssapi/service_world.h"

#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/saml_token.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

namespace Testing {

namespace {

/// The name of a file, without "FILE:".
std::string PathOf(const std::string &kerberosName) {
  return kerberosName.substr(kerberosName.find(':') + 1);
}

std::vector<std::string> WithKeytab(const std::string &keytab, const std::vector<std::string> &arguments) {
  std::vector<std::string> all = {"--keytab", keytab};
  all.insert(all.end(), arguments.begin(), arguments.end());
  return all;
}

} // namespace

ServiceWorld::ServiceWorld(const RealmSettings &settings, const std::vector<std::string> &arguments)
    : m_realm(settings), m_service(WithKeytab(PathOf(m_serviceKeytab), arguments)),
      m_tls(Tarvel::Ssl::CreateSSLContext()) {
  m_tls->TrustFile(m_service.PathOf("authority.crt"));
  m_realm.GetTicket("alice", m_realm.AddPrincipal("alice"), m_realm.GetDefaultCache());
}

SsoClient::SecurityTokenServiceConfig ServiceWorld::MakeConfig(const std::string &fault,
                                                               const std::string &identity) const {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = fault.empty() ? m_service.GetUrl() : m_service.FaultUrl(fault);
  config.signingCertificates = {Tarvel::Crypto::CreateCertificateFromPem(m_service.ReadStateFile("signing.crt"))};
  config.sslContext = m_tls.get();
  if (!identity.empty()) {
    config.holderOfKeyConfig = SsoClient::HolderOfKeyConfig{
        Tarvel::Crypto::CreatePrivateKey(m_service.ReadStateFile(identity + ".key")),
        Tarvel::Crypto::CreateCertificateFromPem(m_service.ReadStateFile(identity + ".crt"))};
  }
  return config;
}

SsoClient::TokenSpec HourSpec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

std::string SubjectOf(const SsoClient::SamlToken &token) {
  return token.GetSubject().name + "@" + token.GetSubject().domain;
}

std::shared_ptr<const SsoClient::SamlToken> NegotiateByHand(SsoClient::InternalApi::GssNegotiationContext &context,
                                                            SsoClient::Gssapi::SpnegoHandler &handler, int &legs) {
  SsoClient::InternalApi::GssNegotiationResult result = context.NegotiateToken(*handler.NegotiateLeg({}));
  for (legs = 1; !result.token; ++legs) {
    result = context.NegotiateToken(*handler.NegotiateLeg(*result.serverLeg));
  }
  if (!result.serverLeg->empty()) {
    handler.NegotiateLeg(*result.serverLeg);
  }
  handler.RequireMutualAuthentication();
  return result.token;
}

} // namespace Testing
