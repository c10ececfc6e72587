// SPDX-License-Identifier: Apache-2.0
/// @file
/// The service that callers use: it acts for them at another service.

#pragma once

#include "http.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/token_verifier.h>

#include <memory>

namespace Example {

class Front {
public:
  /// @param config has the identity of this service
  Front(const SsoClient::SecurityTokenServiceConfig &config, unsigned short filesPort);

  /// Answers a request whose body is the caller's token. The answer is that of the other service.
  boost::asio::awaitable<Reply> Answer(std::string body, TimePoint deadline) const;

private:
  boost::asio::awaitable<Reply> ActFor(std::string xml, TimePoint deadline) const;
  void RequireOurKey(const SsoClient::SamlToken &token) const;

  const SsoClient::TokenClient m_client;
  const SsoClient::TokenVerifier m_verifier;
  const std::string m_thumbprint; // of this service's certificate
  const unsigned short m_filesPort;
};

} // namespace Example
