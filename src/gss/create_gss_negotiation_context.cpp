// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "gss/gss_negotiation_context_impl.h"
#include "transport/https_client.h"

#include <tarvel/ssl/ssl_context.h>

namespace SsoClient::InternalApi {

namespace {

/// 40 seconds, a sixth of the time of other requests: a service answers a leg without asking other services.
constexpr std::int64_t LEG_TIMEOUT_MICROSECONDS = 40000000;

} // namespace

std::shared_ptr<GssNegotiationContext> CreateGssNegotiationContext(const SecurityTokenServiceConfig &config,
                                                                   const TokenSpec &spec) {
  return CreateGssNegotiationContext(config, spec, ServiceOptions());
}

std::shared_ptr<GssNegotiationContext> CreateGssNegotiationContext(const SecurityTokenServiceConfig &config,
                                                                   const TokenSpec &spec,
                                                                   const ServiceOptions &options) {
  CheckServiceDialect(options.dialect);
  auto requestBuilder =
      std::make_shared<const RequestBuilderImpl>(config.holderOfKeyConfig, options.dialect, config.stsUrl);
  // `useDomainControllerName` is ignored, because the Kerberos ticket is for the host in the address.
  const HttpsClient client(config.stsUrl, Tarvel::Ref<Tarvel::Ssl::SSLContext>(config.sslContext), config.sslParameter,
                           LEG_TIMEOUT_MICROSECONDS, false, options.dialect);
  auto responseHandler = std::make_shared<const ResponseHandlerImpl>(options.dialect);
  return std::make_shared<GssNegotiationContextImpl>(spec, std::move(requestBuilder), client.CreateSession(),
                                                     std::move(responseHandler), config.signingCertificates, options);
}

} // namespace SsoClient::InternalApi
