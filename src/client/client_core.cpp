// SPDX-License-Identifier: Apache-2.0

#include "client/client_core.h"

#include "client/client_operation.h"
#include "client/retry.h"
#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "operation/operation_events.h"
#include "operation/returned_tokens.h"

#include <cstddef>
#include <mutex>
#include <new>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::ForkSafeMutex;

/// Writes the length of `value` before it, so that different options never have the same description.
void Append(std::string &text, const char *name, const std::string &value) {
  text.append(text.empty() ? "" : " ").append(name).append("=").append(std::to_string(value.size()));
  text.append(":").append(value);
}

void Append(std::string &text, const char *name, std::int64_t value) {
  Append(text, name, std::to_string(value));
}

} // namespace

ClientCore::ClientCore(const SecurityTokenServiceConfig &config, const ClientOptions &options,
                       Collaborators collaborators)
    : m_serviceUrl(config.stsUrl), m_identity(config.holderOfKeyConfig),
      m_signingCertificates(config.signingCertificates), m_options(options),
      m_transport(std::move(collaborators.transport)), m_time(collaborators.time),
      m_requestBuilder(std::move(collaborators.requestBuilder)),
      m_responseHandler(std::move(collaborators.responseHandler)),
      m_returnedTokens(std::make_shared<const ReturnedTokens>(config.signingCertificates, options.service)),
      m_steps(std::make_shared<const TokenSteps>(m_requestBuilder, m_responseHandler, m_returnedTokens)),
      m_generation(Tarvel::GetForkGeneration()) {
  CheckRetryPolicy(options.retryPolicy);
}

ClientCore::~ClientCore() {
  ForgetParent();
}

std::shared_ptr<const TokenSteps> ClientCore::GetSteps(const CallOptions &options) const {
  if (!options.dialect && !options.verifyOptions) {
    return m_steps;
  }
  std::shared_ptr<const RequestBuilder> requestBuilder = m_requestBuilder;
  std::shared_ptr<const ResponseHandler> responseHandler = m_responseHandler;
  if (options.dialect) {
    CheckServiceDialect(*options.dialect);
    requestBuilder = std::make_shared<const RequestBuilderImpl>(m_identity, *options.dialect, m_serviceUrl);
    responseHandler = std::make_shared<const ResponseHandlerImpl>(*options.dialect);
  }
  std::shared_ptr<const ReturnedTokens> returnedTokens = m_returnedTokens;
  if (options.verifyOptions) {
    ServiceOptions own;
    own.verifyOptions = *options.verifyOptions;
    own.refusedTokenSink = m_options.service.refusedTokenSink;
    returnedTokens = std::make_shared<const ReturnedTokens>(m_signingCertificates, own);
  }
  return std::make_shared<const TokenSteps>(std::move(requestBuilder), std::move(responseHandler),
                                            std::move(returnedTokens));
}

std::string ClientCore::GetIdentityThumbprint() const {
  return m_identity ? m_identity->certificate->GetSha256Thumbprint() : std::string();
}

std::string ClientCore::DescribeOptions() const {
  const ServiceDialect &dialect = m_options.service.dialect;
  const VerifyOptions &verification = m_options.service.verifyOptions;
  std::string text;
  Append(text, "profile", static_cast<std::int64_t>(verification.profile));
  Append(text, "tokenType", dialect.tokenType);
  Append(text, "appliesTo", dialect.appliesTo.value_or(std::string()));
  Append(text, "useKey", static_cast<std::int64_t>(dialect.useKey));
  Append(text, "delegation", static_cast<std::int64_t>(dialect.delegation));
  return text;
}

std::shared_ptr<const SamlToken> ClientCore::Verify(const std::string &xml) const {
  OperationEvents unobserved;
  return m_returnedTokens->Verify(xml, unobserved);
}

bool ClientCore::Add(const std::shared_ptr<ClientOperation> &operation) {
  ForgetParent();
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_isClosed) {
    return false;
  }
  operation->place = m_operations.insert(m_operations.end(), operation);
  return true;
}

void ClientCore::Remove(ClientOperation &operation) noexcept {
  OperationList removed; // destroyed outside the lock
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (operation.place) {
    removed.splice(removed.end(), m_operations, *operation.place);
    operation.place = boost::none;
  }
}

void ClientCore::Close() noexcept {
  ForgetParent();
  for (;;) {
    std::shared_ptr<ClientOperation> operation;
    {
      const std::lock_guard<ForkSafeMutex> lock(m_mutex);
      m_isClosed = true;
      if (m_operations.empty()) {
        return;
      }
      operation = m_operations.front();
      m_operations.pop_front();
      operation->place = boost::none;
    }
    operation->Cancel(MakeClientDestroyed());
  }
}

namespace {

/// Never releases the references in `operations`, and empties it. Needs no memory.
void KeepForEver(OperationList &operations) noexcept {
  struct Kept {
    ForkSafeMutex mutex;
    OperationList operations; // guarded by mutex
  };
  alignas(Kept) static std::byte storage[sizeof(Kept)];
  static Kept *const kept = new (storage) Kept; // never destroyed
  const std::lock_guard<ForkSafeMutex> lock(kept->mutex);
  kept->operations.splice(kept->operations.end(), operations);
}

} // namespace

void ClientCore::ForgetParent() noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_generation == Tarvel::GetForkGeneration()) {
    return;
  }
  m_generation = Tarvel::GetForkGeneration();
  for (const std::shared_ptr<ClientOperation> &operation : m_operations) {
    operation->place = boost::none;
  }
  KeepForEver(m_operations);
}

} // namespace SsoClient
