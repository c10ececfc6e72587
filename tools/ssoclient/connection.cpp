// SPDX-License-Identifier: Apache-2.0

#include "connection.h"

#include "exit_code.h"
#include "option.h"

#include <ssoclient/security_token_service_config.h>
#include <tarvel/http/url.h>

#include <cstddef>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Service";
constexpr std::size_t THUMBPRINT_DIGITS = 64;
constexpr std::size_t THUMBPRINT_WITH_COLONS = THUMBPRINT_DIGITS + THUMBPRINT_DIGITS / 2 - 1;

bool IsHexDigit(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

/// Whether the handshake accepts `text` as a thumbprint: it has a colon after every two digits, or none.
bool IsThumbprint(const std::string &text) {
  const bool hasColons = text.size() == THUMBPRINT_WITH_COLONS;
  if (!hasColons && text.size() != THUMBPRINT_DIGITS) {
    return false;
  }
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool isColonsPlace = hasColons && i % 3 == 2;
    if (isColonsPlace ? text[i] != ':' : !IsHexDigit(text[i])) {
      return false;
    }
  }
  return true;
}

bool IsSecure(const std::string &url) {
  bool isSecure = false;
  std::string host;
  int port = 0;
  std::string path;
  Tarvel::Http::ParseHttpURL(url, isSecure, host, port, path);
  return isSecure;
}

} // namespace

void AddConnectionOptions(CLI::App &app, ConnectionOptions &options) {
  AddOption(app, "--sts", options.url, "Address of the token service").Required().TypeName("URL").Group(GROUP);
  const Option ca =
      AddOption(
          app, "--ca", options.caFile,
          "PEM file of the authorities that may issue the server's certificate; by default, the system's trust store")
          .TypeName("FILE")
          .Group(GROUP);
  AddOption(app, "--thumbprint", options.thumbprint,
            "SHA-256 digest of the server's certificate; checked in place of its issuer and name")
      .TypeName("HEX")
      .Group(GROUP)
      .Excludes(ca);
  AddFlag(app, "--allow-http", options.allowHttp,
          "Permit an http address, which sends passwords and tokens unencrypted")
      .Group(GROUP);
}

void CheckConnection(const ConnectionOptions &options) {
  if (!options.thumbprint.empty() && !IsThumbprint(options.thumbprint)) {
    throw UsageException(
        "--thumbprint must be the 64 hexadecimal digits of a SHA-256 digest, with a colon after every two of "
        "them or with none");
  }
  if (IsSecure(options.url)) {
    return;
  }
  if (!options.allowHttp) {
    throw UsageException("--sts is a plain http address, which is not encrypted; --allow-http permits it");
  }
  if (!options.caFile.empty() || !options.thumbprint.empty()) {
    throw UsageException("--ca and --thumbprint protect nothing on a plain http address");
  }
}

Tarvel::Ref<Tarvel::Ssl::SSLContext> CreateContext(const ConnectionOptions &options) {
  if (!IsSecure(options.url)) {
    return nullptr;
  }
  Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  if (!options.caFile.empty()) {
    context->TrustFile(options.caFile);
  } else if (options.thumbprint.empty()) {
    context->TrustSystemStore();
  }
  return context;
}

std::shared_ptr<const TokenClient> CreateClient(const ConnectionOptions &options,
                                                const Tarvel::Crypto::CertificateList &trusted,
                                                const boost::optional<HolderOfKeyConfig> &identity,
                                                const ServiceOptions &serviceOptions) {
  SecurityTokenServiceConfig config;
  config.stsUrl = options.url;
  config.signingCertificates = trusted;
  config.sslParameter = options.thumbprint;
  config.holderOfKeyConfig = identity;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = CreateContext(options);
  config.sslContext = context.get(); // null for plain http; the client takes its own reference
  ClientOptions clientOptions;
  clientOptions.service = serviceOptions;
  return std::make_shared<const TokenClient>(config, clientOptions);
}

} // namespace SsoClient::Tool
