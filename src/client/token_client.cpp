// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/token_client.h>

#include "client/client_core.h"
#include "client/client_operation.h"
#include "client/token_outcome.h"
#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "operation/required_object.h"
#include "transport/https_client.h"

#include <tarvel/ssl/ssl_context.h>

#include <future>
#include <utility>

namespace SsoClient {

namespace {

std::shared_ptr<ClientCore> MakeCore(const SecurityTokenServiceConfig &config, const ClientOptions &options) {
  const ServiceDialect &dialect = options.service.dialect;
  CheckServiceDialect(dialect);
  ClientCore::Collaborators collaborators;
  collaborators.requestBuilder =
      std::make_shared<const RequestBuilderImpl>(config.holderOfKeyConfig, dialect, config.stsUrl);
  collaborators.transport = std::make_shared<const HttpsClient>(
      config.stsUrl, Tarvel::Ref<Tarvel::Ssl::SSLContext>(config.sslContext), config.sslParameter,
      REQUEST_TIMEOUT_MICROSECONDS, config.useDomainControllerName);
  collaborators.responseHandler = std::make_shared<const ResponseHandlerImpl>(dialect);
  return std::make_shared<ClientCore>(config, options, std::move(collaborators));
}

std::shared_ptr<ClientOperation> MakeOperation(const std::shared_ptr<ClientCore> &core, ClientTask task,
                                               const CallOptions &options) {
  return std::make_shared<ClientOperation>(core, std::move(task), options);
}

/// Starts an operation. Its completion is made before it, because the operation reports its start when it is made.
void StartOperation(const std::shared_ptr<ClientCore> &core, ClientTask task, const CallOptions &options,
                    ClientOperation::Completion completion, bool isHere = false) {
  MakeOperation(core, std::move(task), options)->Start(std::move(completion), isHere);
}

void SetValue(std::promise<std::shared_ptr<const SamlToken>> &promise, OperationEnding &&ending) {
  promise.set_value(std::move(ending.token));
}

void SetValue(std::promise<bool> &promise, OperationEnding &&ending) {
  promise.set_value(ending.isValid);
}

/// Starts an operation whose end sets the promise of the returned future.
template <typename Value>
std::future<Value> StartWithFuture(const std::shared_ptr<ClientCore> &core, ClientTask task,
                                   const CallOptions &options) {
  const auto promise = std::make_shared<std::promise<Value>>();
  std::future<Value> future = promise->get_future();
  StartOperation(
      core, std::move(task), options,
      [promise](OperationEnding &&ending) {
        if (ending.failure) {
          promise->set_exception(std::move(ending.failure));
        } else {
          SetValue(*promise, std::move(ending));
        }
      },
      true);
  return future;
}

} // namespace

TokenClient::TokenClient(const SecurityTokenServiceConfig &config, const ClientOptions &options)
    : TokenClient(MakeCore(config, options)) {}

TokenClient::TokenClient(std::shared_ptr<ClientCore> core) noexcept : m_core(std::move(core)) {}

TokenClient::~TokenClient() {
  m_core->Close();
}

std::shared_ptr<const SamlToken> TokenClient::Acquire(const Credential &credential, const TokenSpec &spec,
                                                      const CallOptions &options) const {
  return MakeOperation(m_core, Acquisition{credential, spec}, options)->RunToEnd().token;
}

std::shared_ptr<const SamlToken> TokenClient::Renew(const std::shared_ptr<const SamlToken> &token,
                                                    std::int64_t lifetimeSec, const CallOptions &options) const {
  return MakeOperation(m_core, Renewal{token, lifetimeSec}, options)->RunToEnd().token;
}

bool TokenClient::Validate(const std::shared_ptr<const SamlToken> &token, const CallOptions &options) const {
  return MakeOperation(m_core, Validation{token}, options)->RunToEnd().isValid;
}

void TokenClient::AcquireAsync(const Credential &credential, const TokenSpec &spec, const CallOptions &options,
                               TokenCallback callback) const {
  StartAcquire(m_core, credential, spec, options, std::move(callback));
}

void TokenClient::RenewAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                             const CallOptions &options, TokenCallback callback) const {
  StartRenew(m_core, token, lifetimeSec, options, std::move(callback));
}

void TokenClient::ValidateAsync(const std::shared_ptr<const SamlToken> &token, const CallOptions &options,
                                ValidityCallback callback) const {
  StartValidate(m_core, token, options, std::move(callback));
}

void TokenClient::StartAcquire(const std::shared_ptr<ClientCore> &core, const Credential &credential,
                               const TokenSpec &spec, const CallOptions &options, TokenCallback callback) {
  CheckRequired(static_cast<bool>(callback));
  StartOperation(core, Acquisition{credential, spec}, options, CompletionOf(std::move(callback)));
}

void TokenClient::StartRenew(const std::shared_ptr<ClientCore> &core, const std::shared_ptr<const SamlToken> &token,
                             std::int64_t lifetimeSec, const CallOptions &options, TokenCallback callback) {
  CheckRequired(static_cast<bool>(callback));
  StartOperation(core, Renewal{token, lifetimeSec}, options, CompletionOf(std::move(callback)));
}

void TokenClient::StartValidate(const std::shared_ptr<ClientCore> &core, const std::shared_ptr<const SamlToken> &token,
                                const CallOptions &options, ValidityCallback callback) {
  CheckRequired(static_cast<bool>(callback));
  StartOperation(core, Validation{token}, options, CompletionOf(std::move(callback)));
}

std::future<std::shared_ptr<const SamlToken>>
TokenClient::AcquireFuture(const Credential &credential, const TokenSpec &spec, const CallOptions &options) const {
  return StartWithFuture<std::shared_ptr<const SamlToken>>(m_core, Acquisition{credential, spec}, options);
}

std::future<std::shared_ptr<const SamlToken>> TokenClient::RenewFuture(const std::shared_ptr<const SamlToken> &token,
                                                                       std::int64_t lifetimeSec,
                                                                       const CallOptions &options) const {
  return StartWithFuture<std::shared_ptr<const SamlToken>>(m_core, Renewal{token, lifetimeSec}, options);
}

std::future<bool> TokenClient::ValidateFuture(const std::shared_ptr<const SamlToken> &token,
                                              const CallOptions &options) const {
  return StartWithFuture<bool>(m_core, Validation{token}, options);
}

} // namespace SsoClient
