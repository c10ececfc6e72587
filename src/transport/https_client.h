// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HttpsClient`, the transport over HTTP and HTTPS.

#pragma once

#include "transport/transport.h"

#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/ssl/ssl_context.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient {

/// The time for each request of the product's operations: four minutes, and not configurable. This is long because a service
/// may have to ask other services before it answers.
constexpr std::int64_t REQUEST_TIMEOUT_MICROSECONDS = 240000000;

/// Posts to one address. Immutable, so any number of threads may use it.
class HttpsClient final : public Transport {
public:
  /// @param url the service's address. Plain http is accepted.
  /// @param context may be null for http. The client keeps a reference.
  /// @param sslParameter see `CreateSsoSSLConnectionSpec`
  /// @param timeoutMicroseconds for each `SendRequest` of a session, from the connect to the last byte of the response
  /// @param useDomainControllerName see `CreateSsoSSLConnectionSpec`
  /// @throws Tarvel::Http::MalformedURLException for a malformed address.
  /// @throws Tarvel::InvalidArgumentException for https without a context.
  HttpsClient(const std::string &url, const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
              const std::string &sslParameter, std::int64_t timeoutMicroseconds, bool useDomainControllerName);
  HttpsClient(const std::string &url, const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
              const std::string &sslParameter, std::int64_t timeoutMicroseconds);

  std::shared_ptr<TransportSession> CreateSession() const override;

private:
  void Init(const std::string &url, const std::string &sslParameter, bool useDomainControllerName);

  Tarvel::Ref<Tarvel::Http::ConnectionSpec> m_spec;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  std::string m_path;
  const std::int64_t m_timeoutMicroseconds;
};

} // namespace SsoClient
