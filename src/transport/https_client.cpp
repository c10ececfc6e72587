// SPDX-License-Identifier: Apache-2.0

#include "transport/https_client.h"

#include "transport/https_session.h"

#include <ssoclient/connection_spec.h>
#include <tarvel/core/exception.h>
#include <tarvel/http/url.h>

namespace SsoClient {

HttpsClient::HttpsClient(const std::string &url, const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
                         const std::string &sslParameter, std::int64_t timeoutMicroseconds,
                         bool useDomainControllerName, const ServiceDialect &dialect)
    : m_context(context), m_timeoutMicroseconds(timeoutMicroseconds), m_declaresCharset(dialect.declaresCharset) {
  Init(url, sslParameter, useDomainControllerName);
}

HttpsClient::HttpsClient(const std::string &url, const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
                         const std::string &sslParameter, std::int64_t timeoutMicroseconds)
    : HttpsClient(url, context, sslParameter, timeoutMicroseconds, false) {}

void HttpsClient::Init(const std::string &url, const std::string &sslParameter, bool useDomainControllerName) {
  bool isSecure = false;
  std::string host;
  int port = 0;
  Tarvel::Http::ParseHttpURL(url, isSecure, host, port, m_path);
  if (!isSecure) {
    CreateSsoConnectionSpec(host, port, useDomainControllerName, m_spec);
    return;
  }
  if (!m_context) {
    throw Tarvel::InvalidArgumentException("HTTPS connection requested but no SSLContext provided.");
  }
  CreateSsoSSLConnectionSpec(host, port, m_context, sslParameter, useDomainControllerName, m_spec);
}

std::shared_ptr<TransportSession> HttpsClient::CreateSession() const {
  return std::make_shared<HttpsSession>(m_spec, m_path, m_timeoutMicroseconds, m_declaresCharset);
}

} // namespace SsoClient
