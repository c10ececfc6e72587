// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ClientCredential`, what the client negotiates with.

#pragma once

#include "gss_handles.h"
#include "memory_cache.h"

#include <ssoclient/gssapi/spnego_handler.h>

#include <memory>

namespace SsoClient::Gssapi {

/// A credential for SPNEGO with Kerberos and no other mechanism beneath, so that nothing but the ticket that the settings
/// name is ever offered.
class ClientCredential {
public:
  /// Asks the realm for a ticket when the settings name a keytab and there is none yet.
  /// @throws GssCredentialException when there is no usable credential. There is no falling back to another.
  explicit ClientCredential(const SpnegoSettings &settings);

  gss_cred_id_t Get() const noexcept { return m_credential.Get(); }

private:
  std::unique_ptr<const MemoryCache> m_cache; // before the credential, which uses it; null when a cache is named
  CredentialHandle m_credential;
};

} // namespace SsoClient::Gssapi
