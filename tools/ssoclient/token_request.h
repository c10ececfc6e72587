// SPDX-License-Identifier: Apache-2.0
/// @file
/// A request for a token that a command line describes, and the output of the token.

#pragma once

#include "connection.h"
#include "credentials.h"
#include "dialect_options.h"
#include "identity.h"
#include "refused_token.h"
#include "service_call.h"
#include "token_output.h"
#include "token_spec_options.h"
#include "trust.h"

#include <boost/optional.hpp>

#include <functional>
#include <memory>

namespace SsoClient::Tool {

struct TokenRequestOptions {
  ConnectionOptions connection;
  DialectOptions dialect;
  TrustOptions trust;
  CredentialsOptions credentials;
  IdentityOptions identity;
  TokenSpecOptions token;
  TokenOutputOptions tokenOutput;
};

void AddTokenRequestOptions(CLI::App &app, TokenRequestOptions &options);

/// Refers to the options, which outlive it.
class TokenRequest {
public:
  /// Checks the command line, and then reads its files, but no credential. Sends nothing.
  /// @param observer follows the operations; null for none
  TokenRequest(const TokenRequestOptions &options, const OutputOptions &output,
               std::shared_ptr<OperationObserver> observer);

  const TokenSpec &GetSpec() const noexcept { return m_spec; }
  const std::shared_ptr<const TokenClient> &GetClient() const noexcept { return m_client; }
  const boost::optional<HolderOfKeyConfig> &GetIdentity() const noexcept { return m_identity; }

  /// Reads the credential, for example a password at a prompt.
  DoubtedCredential ReadCredential() const;

  /// Whether the token is valid with the tolerance of the command line.
  bool IsAccepted(const SamlToken &token) const;

  /// Writes the token that `call` returns. If the token is refused, adds a hint to the exception.
  /// @throws what `call` throws; ParseException for a token that the tool refuses; and what `WriteToken` throws
  void Write(const std::function<IssuedToken()> &call) const;

private:
  const TokenRequestOptions &m_options;
  const OutputOptions &m_output;
  TokenSpec m_spec;
  const CredentialsKind *m_kind = nullptr;
  ServiceDialect m_dialect;
  Tarvel::Crypto::CertificateList m_trusted;
  VerifyOptions m_verifyOptions;
  boost::optional<RefusedToken> m_refused;
  boost::optional<HolderOfKeyConfig> m_identity;
  std::shared_ptr<const TokenClient> m_client;
};

} // namespace SsoClient::Tool
