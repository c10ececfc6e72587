// SPDX-License-Identifier: Apache-2.0
/// @file
/// The connection specifications with which the client reaches its service, for hosts that use the platform's HTTP client
/// themselves.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/ssl/ssl_context.h>

#include <string>

namespace SsoClient {

/// A specification of plain TCP connections.
/// @param host a name or an address, without brackets. @param port 1 to 65535; whatever else is wrong with either is told
///        by the connection's completion.
/// @param useDomainControllerName puts `GetOstrelDCName()` in place of `host` when connecting, if that is not empty.
SSOCLIENT_API void CreateSsoConnectionSpec(const std::string &host, int port, bool useDomainControllerName,
                                           Tarvel::Ref<Tarvel::Http::ConnectionSpec> &out);

/// A specification of TLS connections.
/// @param context what to trust and whom to be; shared with the specification. The server is verified as a TLS stream of
///        the context does that. Without a context each connection fails.
/// @param parameter empty, or the SHA-256 thumbprint of the server's certificate; see `Tarvel::Ssl::SSLStream`.
SSOCLIENT_API void CreateSsoSSLConnectionSpec(const std::string &host, int port,
                                              const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
                                              const std::string &parameter, bool useDomainControllerName,
                                              Tarvel::Ref<Tarvel::Http::ConnectionSpec> &out);

/// The name of the directory service's domain controller. No directory is asked: always empty.
SSOCLIENT_API std::string GetOstrelDCName();

} // namespace SsoClient
