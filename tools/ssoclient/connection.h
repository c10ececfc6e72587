// SPDX-License-Identifier: Apache-2.0
/// @file
/// The connection options, and the client that they describe.

#pragma once

#include <ssoclient/client/token_client.h>
#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/service_options.h>
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

/// @throws UsageException for a plain-http address that was not allowed or that has options for TLS, and for a
///         malformed thumbprint.
/// @throws Tarvel::Http::MalformedURLException
void CheckConnection(const ConnectionOptions &options);

/// The TLS context of the connections to the service; null for plain http. It trusts the file of --ca, or the system's
/// store if neither --ca nor --thumbprint is given.
/// @throws Tarvel::IOException, Tarvel::Crypto::CryptoException
Tarvel::Ref<Tarvel::Ssl::SSLContext> CreateContext(const ConnectionOptions &options);

/// A client of the service. Nothing is connected yet.
/// @throws Tarvel::IOException, Tarvel::Crypto::CryptoException
std::shared_ptr<const TokenClient> CreateClient(const ConnectionOptions &options,
                                                const Tarvel::Crypto::CertificateList &trusted,
                                                const boost::optional<HolderOfKeyConfig> &identity,
                                                const ServiceOptions &serviceOptions);

} // namespace SsoClient::Tool
