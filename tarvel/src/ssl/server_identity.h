// SPDX-License-Identifier: Apache-2.0
/// @file
/// Who the server has to be: the host name, or the thumbprint of its certificate.

#pragma once

#include <openssl/ssl.h>

#include <string>

namespace Tarvel::Ssl {

class ServerIdentity {
public:
  /// @param host a name or an address, this with or without brackets.
  /// @param parameter empty, or a SHA-256 thumbprint: 64 hexadecimal digits, in pairs with colons between or without.
  /// @throws SSLException when `parameter` is any other text, or `host` is no ASCII text; the message is the reason.
  ServerIdentity(const std::string &host, const std::string &parameter);

  /// Sends the name, and has chain verification check it.
  /// @throws SSLException, OutOfMemoryException
  void Apply(SSL *connection) const;

  /// Whether the thumbprint stands in for chain and name.
  bool HasThumbprint() const noexcept { return !m_thumbprint.empty(); }

  /// Why `certificate`, null for none, does not have the thumbprint; empty when it has.
  /// @throws Crypto::CryptoException, OutOfMemoryException
  std::string RefuseByThumbprint(X509 *certificate) const;

  /// Two identities have the same text exactly when their checks are the same.
  std::string ToKey() const { return m_host + '\n' + m_thumbprint; }

private:
  void ApplyName(SSL *connection) const;

  std::string m_host;       // lower case, without brackets, scope and the root's dot
  std::string m_thumbprint; // lower-case digits; empty for none
  bool m_isAddress = false;
};

} // namespace Tarvel::Ssl
