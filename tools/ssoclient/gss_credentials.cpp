// SPDX-License-Identifier: Apache-2.0

#include "gss_credentials.h"

#include <ssoclient/gssapi/spnego_handler.h>
#include <tarvel/http/url.h>

namespace SsoClient::Tool {
namespace {

/// The principal that web services have by convention (RFC 4559).
std::string UsualService(const std::string &url) {
  bool isSecure = false;
  std::string host;
  int port = 0;
  std::string path;
  Tarvel::Http::ParseHttpURL(url, isSecure, host, port, path);
  return "HTTP@" + host;
}

} // namespace

void RequireGss() {}

NegotiationCredential ToCredential(const GssOptions &options, const std::string &url) {
  Gssapi::SpnegoSettings settings;
  settings.service = options.service.empty() ? UsualService(url) : options.service;
  settings.client = options.client;
  settings.credentialCache = options.credentialCache;
  settings.clientKeytab = options.clientKeytab;
  Gssapi::CreateSpnegoHandler(settings); // refuses wrong settings before the operation starts
  return {[settings] { return Gssapi::CreateSpnegoHandler(settings); }};
}

} // namespace SsoClient::Tool
