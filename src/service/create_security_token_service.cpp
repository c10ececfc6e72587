// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "service/security_token_service_impl.h"
#include "transport/https_client.h"

#include <tarvel/ssl/ssl_context.h>

namespace SsoClient {

std::shared_ptr<SecurityTokenService> CreateSecurityTokenService(const SecurityTokenServiceConfig &config) {
  return CreateSecurityTokenService(config, ServiceOptions());
}

std::shared_ptr<SecurityTokenService> CreateSecurityTokenService(const SecurityTokenServiceConfig &config,
                                                                 const std::shared_ptr<OperationObserver> &observer) {
  ServiceOptions options;
  options.observer = observer;
  return CreateSecurityTokenService(config, options);
}

std::shared_ptr<SecurityTokenService> CreateSecurityTokenService(const SecurityTokenServiceConfig &config,
                                                                 const ServiceOptions &options) {
  CheckServiceDialect(options.dialect);
  auto requestBuilder =
      std::make_shared<const RequestBuilderImpl>(config.holderOfKeyConfig, options.dialect, config.stsUrl);
  auto transport = std::make_shared<const HttpsClient>(
      config.stsUrl, Tarvel::Ref<Tarvel::Ssl::SSLContext>(config.sslContext), config.sslParameter,
      REQUEST_TIMEOUT_MICROSECONDS, config.useDomainControllerName);
  auto responseHandler = std::make_shared<const ResponseHandlerImpl>(options.dialect);
  return std::make_shared<SecurityTokenServiceImpl>(std::move(requestBuilder), std::move(transport),
                                                    std::move(responseHandler), config.signingCertificates, options);
}

} // namespace SsoClient
