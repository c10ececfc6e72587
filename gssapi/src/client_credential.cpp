// SPDX-License-Identifier: Apache-2.0

#include "client_credential.h"

#include "gss_name.h"
#include "gss_status.h"

#include <ssoclient/gssapi/exceptions.h>

#include <gssapi/gssapi_ext.h>
#include <gssapi/gssapi_krb5.h>

#include <string>
#include <vector>

namespace SsoClient::Gssapi {

namespace {

/// Where the credentials are, as text for messages.
std::string DescribePlace(const SpnegoSettings &settings) {
  std::string place = settings.credentialCache.empty() ? "the default credential cache"
                                                       : "the credential cache " + settings.credentialCache;
  if (!settings.clientKeytab.empty()) {
    place = "the keytab " + settings.clientKeytab;
  }
  return settings.client.empty() ? place : place + " for " + settings.client;
}

/// Where the credentials are, in the form that the GSSAPI uses.
class CredentialStore {
public:
  CredentialStore(const SpnegoSettings &settings, const std::string &cache) {
    if (!cache.empty()) {
      m_elements.push_back({"ccache", cache.c_str()});
    }
    if (!settings.clientKeytab.empty()) {
      m_elements.push_back({"client_keytab", settings.clientKeytab.c_str()});
    }
    m_store = {static_cast<OM_uint32>(m_elements.size()), m_elements.data()};
  }

  gss_const_key_value_set_t Get() const noexcept { return m_elements.empty() ? GSS_C_NO_CRED_STORE : &m_store; }

private:
  std::vector<gss_key_value_element_desc> m_elements;
  gss_key_value_set_desc m_store = {0, nullptr};
};

/// @param lifetime set to the seconds for which the credential is still valid; 0 when it has expired.
GssStatus Acquire(gss_name_t client, gss_OID mechanism, const CredentialStore &store, CredentialHandle &credential,
                  OM_uint32 &lifetime) {
  gss_OID_set_desc mechanisms = {1, mechanism};
  GssStatus status;
  status.major = gss_acquire_cred_from(&status.minor, client, GSS_C_INDEFINITE, &mechanisms, GSS_C_INITIATE,
                                       store.Get(), credential.Slot(), nullptr, &lifetime);
  return status;
}

void RequireSuccess(const GssStatus &status, gss_OID mechanism, const SpnegoSettings &settings) {
  if (status.IsError()) {
    throw GssCredentialException("No credentials in " + DescribePlace(settings) + ": " +
                                 DescribeStatus(status, mechanism));
  }
}

} // namespace

ClientCredential::ClientCredential(const SpnegoSettings &settings) {
  if (!settings.clientKeytab.empty() && settings.credentialCache.empty()) {
    m_cache = std::make_unique<const MemoryCache>();
  }
  const CredentialStore store(settings, m_cache ? m_cache->GetName() : settings.credentialCache);
  NameHandle client;
  if (!settings.client.empty()) {
    ImportName(settings.client, GSS_KRB5_NT_PRINCIPAL_NAME, client);
  }

  // The credential for Kerberos is acquired first, because SPNEGO does not report why it finds none.
  CredentialHandle kerberos;
  OM_uint32 lifetime = 0;
  RequireSuccess(Acquire(client.Get(), KerberosMechanism(), store, kerberos, lifetime), KerberosMechanism(), settings);
  if (lifetime == 0) {
    throw GssCredentialException("The ticket in " + DescribePlace(settings) + " has expired");
  }
  RequireSuccess(Acquire(client.Get(), SpnegoMechanism(), store, m_credential, lifetime), SpnegoMechanism(), settings);

  gss_OID_set_desc offered = {1, KerberosMechanism()};
  GssStatus status;
  status.major = gss_set_neg_mechs(&status.minor, m_credential.Get(), &offered);
  RequireSuccess(status, SpnegoMechanism(), settings);
}

} // namespace SsoClient::Gssapi
