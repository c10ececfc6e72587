// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenClient`, a client of one token service with deadlines, cancellation and coroutines.

#pragma once

#include <ssoclient/client/awaitable.h>
#include <ssoclient/client/call_options.h>
#include <ssoclient/client/credential.h>
#include <ssoclient/client/exceptions.h>
#include <ssoclient/client/outcome.h>
#include <ssoclient/export.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/service_options.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <future>
#include <memory>

namespace SsoClient {

/// Options of a client.
struct ClientOptions {
  /// Observer, dialect, verify options, and the sink for refused tokens.
  ServiceOptions service;
  /// Where callbacks run; empty for the library's own threads.
  Executor executor;
  /// When an operation is tried again; by default never.
  RetryPolicy retryPolicy;
};

/// What a client is made of. Not for callers.
class ClientCore;

class SSOCLIENT_API TokenClient {
public:
  explicit TokenClient(const SecurityTokenServiceConfig &config, const ClientOptions &options = {});
  TokenClient(const TokenClient &) = delete;
  TokenClient &operator=(const TokenClient &) = delete;
  /// Cancels the operations that are under way. Waits for nothing; each callback still runs, on its executor.
  ~TokenClient();

  // A call that waits.
  std::shared_ptr<const SamlToken> Acquire(const Credential &credential, const TokenSpec &spec,
                                           const CallOptions &options = {}) const;
  std::shared_ptr<const SamlToken> Renew(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                                         const CallOptions &options = {}) const;
  bool Validate(const std::shared_ptr<const SamlToken> &token, const CallOptions &options = {}) const;

  // With a callback.
  void AcquireAsync(const Credential &credential, const TokenSpec &spec, const CallOptions &options,
                    TokenCallback callback) const;
  void RenewAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec, const CallOptions &options,
                  TokenCallback callback) const;
  void ValidateAsync(const std::shared_ptr<const SamlToken> &token, const CallOptions &options,
                     ValidityCallback callback) const;

  // As a future.
  std::future<std::shared_ptr<const SamlToken>> AcquireFuture(const Credential &credential, const TokenSpec &spec,
                                                              const CallOptions &options = {}) const;
  std::future<std::shared_ptr<const SamlToken>> RenewFuture(const std::shared_ptr<const SamlToken> &token,
                                                            std::int64_t lifetimeSec,
                                                            const CallOptions &options = {}) const;
  std::future<bool> ValidateFuture(const std::shared_ptr<const SamlToken> &token,
                                   const CallOptions &options = {}) const;

#ifdef SSOCLIENT_HAS_COROUTINES
  // As an awaitable, which keeps what it needs of the client, so that the client may be destroyed (this cancels).
  Awaitable<std::shared_ptr<const SamlToken>> AcquireAwaitable(const Credential &credential, const TokenSpec &spec,
                                                               const CallOptions &options = {}) const;
  Awaitable<std::shared_ptr<const SamlToken>> RenewAwaitable(const std::shared_ptr<const SamlToken> &token,
                                                             std::int64_t lifetimeSec,
                                                             const CallOptions &options = {}) const;
  Awaitable<bool> ValidateAwaitable(const std::shared_ptr<const SamlToken> &token,
                                    const CallOptions &options = {}) const;
#endif

private:
  std::shared_ptr<ClientCore> m_core;
};

} // namespace SsoClient
