// SPDX-License-Identifier: Apache-2.0
/// @file
/// The starting point of tests of a whole acquisition: a realm, the development service with its key, and the user
/// alice.

#pragma once

#include "integration/gssapi/negotiation_fixture.h"
#include "support/dev_sts.h"

#include <ssoclient/gss_negotiation_context.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <memory>
#include <string>
#include <vector>

namespace Testing {

/// The realm CORP.EXAMPLE; the development service, which knows alice@CORP.EXAMPLE by the name alice@corp.example; and
/// alice's ticket in the default cache.
class ServiceWorld {
public:
  /// @param arguments further arguments of the service, after its keytab
  explicit ServiceWorld(const RealmSettings &settings = {.name = "CORP.EXAMPLE"},
                        const std::vector<std::string> &arguments = {});

  const KerberosRealm &GetRealm() const noexcept { return m_realm; }
  const DevSts &GetService() const noexcept { return m_service; }

  /// The configuration for the service; with `fault`, for the address at which the service makes that fault.
  /// @param identity "client" for holder-of-key tokens; empty for none
  SsoClient::SecurityTokenServiceConfig MakeConfig(const std::string &fault = "",
                                                   const std::string &identity = "") const;

private:
  const KerberosRealm m_realm; // before the service, which inherits its environment
  const std::string m_serviceKeytab = m_realm.AddPrincipal("sts/localhost");
  const DevSts m_service;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_tls;
};

/// A spec with a lifetime of one hour.
SsoClient::TokenSpec HourSpec();

/// For example "alice@corp.example".
std::string SubjectOf(const SsoClient::SamlToken &token);

/// Negotiates leg by leg, until mutual authentication.
/// @param legs set to the number of messages that were sent
std::shared_ptr<const SsoClient::SamlToken> NegotiateByHand(SsoClient::InternalApi::GssNegotiationContext &context,
                                                            SsoClient::Gssapi::SpnegoHandler &handler, int &legs);

} // namespace Testing
