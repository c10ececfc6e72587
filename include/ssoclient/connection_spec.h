// SPDX-License-Identifier: Apache-2.0
/// @file
/// The connection specifications of the client, for hosts that use the platform's HTTP client themselves.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/ssl/ssl_context.h>

#include <string>

namespace SsoClient {

/// A specification of plain TCP connections.
/// @param host a name or an address, without brackets. It is not checked here: errors are reported by the completion of
///        `AsyncConnect`.
/// @param port 1 to 65535, not checked here either.
/// @param useDomainControllerName connects to `GetOstrelDCName()` instead of `host` when that name is not empty.
SSOCLIENT_API Tarvel::Ref<Tarvel::Http::ConnectionSpec> CreateSsoConnectionSpec(const std::string &host, int port,
                                                                                bool useDomainControllerName);

/// The same, but sets `out` to the specification.
SSOCLIENT_API void CreateSsoConnectionSpec(const std::string &host, int port, bool useDomainControllerName,
                                           Tarvel::Ref<Tarvel::Http::ConnectionSpec> &out);

/// A specification of TLS connections.
/// @param host see `CreateSsoConnectionSpec`
/// @param port see `CreateSsoConnectionSpec`
/// @param context trust settings and client certificate. The specification keeps a reference. The server is verified as
///        `Tarvel::Ssl::SSLStream` describes. Without a context every connection fails.
/// @param parameter empty, or the SHA-256 thumbprint of the server's certificate; see `Tarvel::Ssl::SSLStream`
/// @param useDomainControllerName see `CreateSsoConnectionSpec`
SSOCLIENT_API Tarvel::Ref<Tarvel::Http::ConnectionSpec>
CreateSsoSSLConnectionSpec(const std::string &host, int port, const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
                           const std::string &parameter, bool useDomainControllerName);

/// The same, but sets `out` to the specification.
SSOCLIENT_API void CreateSsoSSLConnectionSpec(const std::string &host, int port,
                                              const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
                                              const std::string &parameter, bool useDomainControllerName,
                                              Tarvel::Ref<Tarvel::Http::ConnectionSpec> &out);

/// The name of a domain controller. No directory is queried, so the name is always empty.
SSOCLIENT_API std::string GetOstrelDCName();

} // namespace SsoClient
