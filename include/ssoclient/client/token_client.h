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
#include <utility>

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
/// What a token source uses of a client. Not for callers.
class ClientIssuer;

/// A client of one token service. Its operations have deadlines, can be cancelled, and need no thread of their own
/// while they wait for the network. Their requests, results and failures are those of `SecurityTokenService`. Safe on
/// any thread.
///
/// Each operation has four forms:
/// - a call that waits (`Acquire`) returns the result, or throws the failure in its own class;
/// - with a callback (`AcquireAsync`), the call returns at once, and the callback is called exactly once with the
///   outcome, on the executor of the call or of the client. Without an executor, it runs on one of the library's own
///   threads (at most four), where it must not block. It is never called within the call that starts the operation,
///   unless its outcome is known at the start and no thread can be started. What a callback throws is logged (logger "SsoClient", level 8) and changes
///   nothing else;
/// - as a future (`AcquireFuture`), which becomes ready on a thread of the library. Destroying the future neither waits nor
///   cancels;
/// - as an awaitable (`AcquireAwaitable`), for coroutines. The operation starts when it is awaited. The awaitable keeps
///   what it needs of the client, so the client may be destroyed (this cancels).
///
/// All operations fail like those of `SecurityTokenService`: with the exceptions in `exceptions.h`, and with those of
/// the platform that are named there. In addition, an operation fails with
/// - `CancelledException`, "The operation was cancelled", when its token is cancelled, and "The operation was cancelled because
///   its client was destroyed";
/// - `DeadlineExceededException`, "The deadline passed before the operation ended";
/// - `SsoException`, "The service returned an empty text instead of a token": a result is never null;
/// - `Tarvel::InvalidArgumentException` for a null token, an empty `makeHandler`, and options that are not valid;
/// - what a negotiation handler throws, or the function that makes it.
///
/// A cancelled or late operation ends at once, and closes its connection. Work that cannot be interrupted (looking up a
/// name, a leg of a negotiation handler, the verification of a token) continues on a thread of the library, and has no
/// effect, except that the sink of refused tokens may still be called. If a token is cancelled, or a deadline has passed, when an operation starts, nothing is composed or sent.
///
/// A function that starts an operation throws only what keeps it from starting: `Tarvel::InvalidArgumentException` for a null
/// callback, `Tarvel::InvalidStateException` when no thread can be started, and `std::bad_alloc`. The callback is not called
/// then.
///
/// In a child of `fork`, a client of the parent can be used. The operations of the parent continue only in the parent:
/// in the child, their callbacks are not called, and their futures never become ready.
class SSOCLIENT_API TokenClient {
public:
  /// Copies the configuration, and takes its own reference to the SSL context. Nothing is sent.
  /// @throws Tarvel::InvalidArgumentException for options that are not valid, an identity that lacks its key or its
  ///         certificate, and https without a context.
  /// @throws Tarvel::Http::MalformedURLException for a malformed address.
  explicit TokenClient(const SecurityTokenServiceConfig &config, const ClientOptions &options = {});
  /// Not for callers.
  explicit TokenClient(std::shared_ptr<ClientCore> core) noexcept;
  TokenClient(const TokenClient &) = delete;
  TokenClient &operator=(const TokenClient &) = delete;
  /// Cancels the operations that are under way, and does not wait. Each callback still runs, on its executor. May be
  /// called in a callback.
  ~TokenClient();

  /// A new token for `credential`, as `spec` describes it. Waits for the end of the operation.
  std::shared_ptr<const SamlToken> Acquire(const Credential &credential, const TokenSpec &spec,
                                           const CallOptions &options = {}) const;
  /// A token like `token` that is valid for `lifetimeSec` seconds from now. `token` must be holder-of-key and
  /// renewable. Waits for the end of the operation.
  std::shared_ptr<const SamlToken> Renew(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                                         const CallOptions &options = {}) const;
  /// Whether the service reports that `token` is valid. Waits for the end of the operation.
  bool Validate(const std::shared_ptr<const SamlToken> &token, const CallOptions &options = {}) const;

  /// `Acquire` with a callback.
  void AcquireAsync(const Credential &credential, const TokenSpec &spec, const CallOptions &options,
                    TokenCallback callback) const;
  /// `Renew` with a callback.
  void RenewAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec, const CallOptions &options,
                  TokenCallback callback) const;
  /// `Validate` with a callback.
  void ValidateAsync(const std::shared_ptr<const SamlToken> &token, const CallOptions &options,
                     ValidityCallback callback) const;

  /// `Acquire` as a future.
  std::future<std::shared_ptr<const SamlToken>> AcquireFuture(const Credential &credential, const TokenSpec &spec,
                                                              const CallOptions &options = {}) const;
  /// `Renew` as a future.
  std::future<std::shared_ptr<const SamlToken>> RenewFuture(const std::shared_ptr<const SamlToken> &token,
                                                            std::int64_t lifetimeSec,
                                                            const CallOptions &options = {}) const;
  /// `Validate` as a future.
  std::future<bool> ValidateFuture(const std::shared_ptr<const SamlToken> &token,
                                   const CallOptions &options = {}) const;

#ifdef SSOCLIENT_HAS_COROUTINES
  /// `Acquire` as an awaitable.
  Awaitable<std::shared_ptr<const SamlToken>> AcquireAwaitable(const Credential &credential, const TokenSpec &spec,
                                                               const CallOptions &options = {}) const {
    return Awaitable<std::shared_ptr<const SamlToken>>(
        [core = m_core, credential, spec, options](const CancelToken &cancelToken, TokenCallback callback) {
          StartAcquire(core, credential, spec, WithToken(options, cancelToken), std::move(callback));
        });
  }
  /// `Renew` as an awaitable.
  Awaitable<std::shared_ptr<const SamlToken>> RenewAwaitable(const std::shared_ptr<const SamlToken> &token,
                                                             std::int64_t lifetimeSec,
                                                             const CallOptions &options = {}) const {
    return Awaitable<std::shared_ptr<const SamlToken>>(
        [core = m_core, token, lifetimeSec, options](const CancelToken &cancelToken, TokenCallback callback) {
          StartRenew(core, token, lifetimeSec, WithToken(options, cancelToken), std::move(callback));
        });
  }
  /// `Validate` as an awaitable.
  Awaitable<bool> ValidateAwaitable(const std::shared_ptr<const SamlToken> &token,
                                    const CallOptions &options = {}) const {
    return Awaitable<bool>([core = m_core, token, options](const CancelToken &cancelToken, ValidityCallback callback) {
      StartValidate(core, token, WithToken(options, cancelToken), std::move(callback));
    });
  }
#endif

private:
  friend class ClientIssuer;

  static void StartAcquire(const std::shared_ptr<ClientCore> &core, const Credential &credential, const TokenSpec &spec,
                           const CallOptions &options, TokenCallback callback);
  static void StartRenew(const std::shared_ptr<ClientCore> &core, const std::shared_ptr<const SamlToken> &token,
                         std::int64_t lifetimeSec, const CallOptions &options, TokenCallback callback);
  static void StartValidate(const std::shared_ptr<ClientCore> &core, const std::shared_ptr<const SamlToken> &token,
                            const CallOptions &options, ValidityCallback callback);
  static CallOptions WithToken(CallOptions options, const CancelToken &cancelToken) {
    options.cancelToken = CancelToken::AnyOf(options.cancelToken, cancelToken);
    return options;
  }

  std::shared_ptr<ClientCore> m_core;
};

} // namespace SsoClient
