// SPDX-License-Identifier: Apache-2.0
/// @file
/// `AsyncAcquire`, `AsyncRenew` and `AsyncValidate`: the operations of a `TokenClient` for programs that use Boost.Asio.
///
/// Each function starts an operation and passes its outcome to the completion token, such as a handler,
/// `boost::asio::use_future` or `boost::asio::use_awaitable`. A handler gets a `std::exception_ptr`, null for a success, and the
/// result.
///
/// The handler is called once, never within the function that starts the operation. Its associated executor calls it,
/// and has work until then. A handler without an executor is called on a thread of the library (at most four), where it
/// must not block. The handler's allocator allocates what its executor queues. What the start of the operation throws
/// is passed to the handler, too. If the execution context is destroyed first, the handler is destroyed and not called,
/// like all handlers of Asio, and the operation is cancelled. In a child of `fork`, no handler of the parent is called;
/// `notify_fork` destroys them.
///
/// The operation is cancelled by `cancelToken` of the options, and, where Asio has cancellation slots (from Boost 1.77 on), by
/// the handler's slot, with any type of cancellation.

#pragma once

#include <ssoclient/asio/detail/start_operation.h>
#include <ssoclient/client/token_client.h>

#include <cstdint>
#include <memory>
#include <utility>

/// The client for programs that use Boost.Asio.
namespace SsoClient::Asio {

/// Acquires a token, like `TokenClient::AcquireAsync`. The handler's signature is `void(std::exception_ptr,
/// std::shared_ptr<const SamlToken>)`; the token is null when there is an exception.
/// @param client must exist until the operation starts, which `use_awaitable` and other lazy tokens do later
/// @param options its executor is not used
/// @return what the completion token returns, for example a `std::future<std::shared_ptr<const SamlToken>>`
/// @throws std::bad_alloc
template <typename CompletionToken>
auto AsyncAcquire(const TokenClient &client, Credential credential, TokenSpec spec, CallOptions options,
                  CompletionToken &&token) {
  return Detail::Initiate<std::shared_ptr<const SamlToken>>(
      std::move(options), token,
      [&client, credential = std::move(credential), spec = std::move(spec)](const CallOptions &call,
                                                                            TokenCallback callback) {
        client.AcquireAsync(credential, spec, call, std::move(callback));
      });
}

/// Renews a token, like `TokenClient::RenewAsync`. Parameters, signature and result as for `AsyncAcquire`.
/// @throws std::bad_alloc
template <typename CompletionToken>
auto AsyncRenew(const TokenClient &client, std::shared_ptr<const SamlToken> renewed, std::int64_t lifetimeSec,
                CallOptions options, CompletionToken &&token) {
  return Detail::Initiate<std::shared_ptr<const SamlToken>>(
      std::move(options), token,
      [&client, renewed = std::move(renewed), lifetimeSec](const CallOptions &call, TokenCallback callback) {
        client.RenewAsync(renewed, lifetimeSec, call, std::move(callback));
      });
}

/// Asks the service whether a token is valid, like `TokenClient::ValidateAsync`. The handler's signature is
/// `void(std::exception_ptr, bool)`; parameters and result as for `AsyncAcquire`.
/// @throws std::bad_alloc
template <typename CompletionToken>
auto AsyncValidate(const TokenClient &client, std::shared_ptr<const SamlToken> validated, CallOptions options,
                   CompletionToken &&token) {
  return Detail::Initiate<bool>(
      std::move(options), token,
      [&client, validated = std::move(validated)](const CallOptions &call, ValidityCallback callback) {
        client.ValidateAsync(validated, call, std::move(callback));
      });
}

} // namespace SsoClient::Asio
