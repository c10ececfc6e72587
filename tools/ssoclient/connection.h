// SPDX-License-Identifier: Apache-2.0
/// @file
/// How a command reaches the token service.

#pragma once

#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <boost/optional.hpp>

#include <memory>
#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct ConnectionOptions {
  std::string url;
  std::string caFile;     ///< empty: the system's trust store
  std::string thumbprint; ///< of the server's certificate; empty: its chain and name are checked
  bool allowHttp = false;
};

void AddConnectionOptions(CLI::App &app, ConnectionOptions &options);

/// @throws UsageException for a plain-http address that was not allowed, for one with options that only TLS heeds, and
///         for a text that is no thumbprint. @throws Tarvel::Http::MalformedURLException
void CheckConnection(const ConnectionOptions &options);

/// A client of the service, with what must live as long as it does. Nothing is connected yet.
struct Connection {
  Tarvel::Ref<Tarvel::Ssl::SSLContext> context;
  std::shared_ptr<SecurityTokenService> service;
};

/// @throws Tarvel::IOException, Tarvel::Crypto::CryptoException
Connection CreateConnection(const ConnectionOptions &options, const Tarvel::Crypto::CertificateList &trusted,
                            const boost::optional<HolderOfKeyConfig> &identity);

} // namespace SsoClient::Tool
