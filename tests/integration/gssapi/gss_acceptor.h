// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssAcceptor`, the service's part of one negotiation, in this process: the GSSAPI's own.

#pragma once

#include "gss_handles.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace Testing {

class GssAcceptor {
public:
  /// @param keytab as "FILE:…"
  /// @param folder for the cache that tells replays
  GssAcceptor(const std::string &keytab, const std::filesystem::path &folder);

  /// Takes the client's leg.
  /// @return the service's; also after a failure there may be one, which tells the client of it.
  std::vector<std::uint8_t> Accept(const std::vector<std::uint8_t> &leg);

  bool IsComplete() const noexcept { return m_isComplete; }
  /// As "alice@EXAMPLE.TEST"; empty before the negotiation is complete.
  const std::string &GetClient() const noexcept { return m_client; }
  /// What the GSSAPI says of the failure; empty for none.
  const std::string &GetFailure() const noexcept { return m_failure; }
  bool HasDelegatedCredential() const noexcept { return m_delegated.Get() != nullptr; }

private:
  SsoClient::Gssapi::CredentialHandle m_credential;
  SsoClient::Gssapi::CredentialHandle m_delegated;
  SsoClient::Gssapi::ContextHandle m_context;
  bool m_isComplete = false;
  std::string m_client;
  std::string m_failure;
};

} // namespace Testing
