// SPDX-License-Identifier: Apache-2.0
/// @file
/// The identity that is required of the server: the host name, or the thumbprint of its certificate.

#pragma once

#include <openssl/ssl.h>

#include <string>

namespace Tarvel::Ssl {

class ServerIdentity {
public:
  /// @param host a name, or an address with or without brackets.
  /// @param parameter empty, or a SHA-256 thumbprint: 64 hexadecimal digits, with or without colons between the pairs.
  /// @throws SSLException when `parameter` is any other text, when `host` is not printable ASCII, or when both are
  ///         empty; the message is the reason.
  ServerIdentity(const std::string &host, const std::string &parameter);

  /// Sets the server name to send, and the name that OpenSSL checks when it verifies the chain.
  /// @throws SSLException, OutOfMemoryException
  void Apply(SSL *connection) const;

  /// Whether the thumbprint is checked instead of the chain and the name.
  bool HasThumbprint() const noexcept { return !m_thumbprint.empty(); }

  /// Why `certificate` (may be null) does not have the thumbprint; empty when it does.
  /// @throws Crypto::CryptoException, OutOfMemoryException
  std::string RefuseByThumbprint(X509 *certificate) const;

  /// A text for comparison: identities with the same text send the same server name and make the same checks.
  std::string ToKey() const { return m_host + '\n' + m_thumbprint; }

private:
  void ApplyName(SSL *connection) const;

  std::string m_host;       // lower case, without brackets, scope and final dot
  std::string m_thumbprint; // lower-case digits; empty when the name is checked
  bool m_isAddress = false;
};

} // namespace Tarvel::Ssl
