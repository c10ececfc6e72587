// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ClientCredential`, with which the client negotiates.

#pragma once

#include "gss_handles.h"
#include "memory_cache.h"

#include <ssoclient/gssapi/spnego_handler.h>

#include <memory>

namespace SsoClient::Gssapi {

/// A credential for SPNEGO with Kerberos as its only mechanism, so that only the ticket that the settings choose is
/// ever offered.
class ClientCredential {
public:
  /// Asks the realm for a ticket when the settings name a keytab and there is no ticket yet.
  /// @throws GssCredentialException when there is no usable credential. No other credential is tried.
  explicit ClientCredential(const SpnegoSettings &settings);

  gss_cred_id_t Get() const noexcept { return m_credential.Get(); }

private:
  // Null unless the settings name a keytab and no cache. Declared before the credential, which uses it.
  std::unique_ptr<const MemoryCache> m_cache;
  CredentialHandle m_credential;
};

} // namespace SsoClient::Gssapi
