// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssAcceptor`, the service's part of one negotiation, done by the GSSAPI in this process.

#pragma once

#include "gss_handles.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace Testing {

class GssAcceptor {
public:
  /// @param keytab in the form "FILE:…"
  /// @param folder for the cache that detects replays
  GssAcceptor(const std::string &keytab, const std::filesystem::path &folder);

  /// Accepts the client's leg.
  /// @return the service's leg; after a failure, it reports the failure to the client, or is empty.
  std::vector<std::uint8_t> Accept(const std::vector<std::uint8_t> &leg);

  bool IsComplete() const noexcept { return m_isComplete; }
  /// For example "alice@EXAMPLE.TEST"; empty before the negotiation is complete.
  const std::string &GetClient() const noexcept { return m_client; }
  /// The GSSAPI's text about the failure; empty without one.
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
