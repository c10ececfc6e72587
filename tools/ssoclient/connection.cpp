// SPDX-License-Identifier: Apache-2.0

#include "connection.h"

#include "exit_code.h"
#include "option.h"

#include <ssoclient/security_token_service_config.h>
#include <tarvel/http/url.h>

#include <algorithm>
#include <cstddef>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Service";
constexpr std::ptrdiff_t THUMBPRINT_DIGITS = 64;

bool IsHexDigit(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

bool IsThumbprint(const std::string &text) {
  const bool isHex = std::all_of(text.begin(), text.end(), [](char c) { return c == ':' || IsHexDigit(c); });
  return isHex && std::count_if(text.begin(), text.end(), IsHexDigit) == THUMBPRINT_DIGITS;
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
  const Option ca = AddOption(app, "--ca", options.caFile,
                              "File with the authorities that may vouch for the server, PEM; without it, the system's")
                        .TypeName("FILE")
                        .Group(GROUP);
  AddOption(app, "--thumbprint", options.thumbprint,
            "SHA-256 of the server's certificate, which then needs no authority")
      .TypeName("HEX")
      .Group(GROUP)
      .Excludes(ca);
  AddFlag(app, "--allow-http", options.allowHttp, "Let passwords and tokens travel unprotected, to an http address")
      .Group(GROUP);
}

void CheckConnection(const ConnectionOptions &options) {
  if (!options.thumbprint.empty() && !IsThumbprint(options.thumbprint)) {
    throw UsageException("--thumbprint wants the 64 hexadecimal digits of a SHA-256 digest; colons may stand between");
  }
  if (IsSecure(options.url)) {
    return;
  }
  if (!options.allowHttp) {
    throw UsageException("--sts is a plain http address, on which everybody can read along; --allow-http permits it");
  }
  if (!options.caFile.empty() || !options.thumbprint.empty()) {
    throw UsageException("--ca and --thumbprint protect nothing on a plain http address");
  }
}

Connection CreateConnection(const ConnectionOptions &options, const Tarvel::Crypto::CertificateList &trusted,
                            const boost::optional<HolderOfKeyConfig> &identity) {
  Connection connection;
  SecurityTokenServiceConfig config;
  config.stsUrl = options.url;
  config.signingCertificates = trusted;
  config.sslParameter = options.thumbprint;
  config.holderOfKeyConfig = identity;
  if (IsSecure(options.url)) {
    connection.context = Tarvel::Ssl::CreateSSLContext();
    if (!options.caFile.empty()) {
      connection.context->TrustFile(options.caFile);
    } else if (options.thumbprint.empty()) {
      connection.context->TrustSystemStore();
    }
    config.sslContext = connection.context.get();
  }
  connection.service = CreateSecurityTokenService(config);
  return connection;
}

} // namespace SsoClient::Tool
