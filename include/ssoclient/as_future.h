// SPDX-License-Identifier: Apache-2.0
/// @file
/// `AsFuture`, which turns an asynchronous operation into a `std::future`.

#pragma once

#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/core/exception.h>

#include <boost/optional.hpp>

#include <exception>
#include <future>
#include <memory>
#include <tuple>
#include <utility>

namespace SsoClient {

/// The parts of `AsFuture` that depend on the kind of completion. Not for callers.
namespace FutureDetails {

/// Stores the outcome of an operation in `promise`: `result`, or a copy of `failure` with its own class.
template <typename Result>
void Fulfil(std::promise<Result> &promise, const Result &result, const Tarvel::Exception *failure) {
  if (!failure) {
    promise.set_value(result);
    return;
  }
  try {
    failure->Throw();
  } catch (...) {
    promise.set_exception(std::current_exception());
  }
}

/// The result of an operation with this type of completion, and `Keep`, which makes a completion that owns a promise.
template <typename Completion>
struct ResultOf;

template <>
struct ResultOf<const SecurityTokenService::TokenCompletion &> {
  using Type = std::shared_ptr<const SamlToken>;

  static SecurityTokenService::TokenCompletion Keep(const std::shared_ptr<std::promise<Type>> &promise) {
    return [promise](const Type &token, const Tarvel::Exception *failure) { Fulfil(*promise, token, failure); };
  }
};

template <>
struct ResultOf<const SecurityTokenService::ValidityCompletion &> {
  using Type = bool;

  static SecurityTokenService::ValidityCompletion Keep(const std::shared_ptr<std::promise<Type>> &promise) {
    return [promise](const boost::optional<bool> &valid, const Tarvel::Exception *failure) {
      Fulfil(*promise, valid.value_or(false), failure);
    };
  }
};

} // namespace FutureDetails

/// Starts an asynchronous operation of `service` and returns the future of its result: a
/// `std::future<std::shared_ptr<const SamlToken>>`, or a `std::future<bool>` for a verdict. For example:
///
///     auto token = AsFuture(*service, &SecurityTokenService::AcquireTokenAsync, "alice", password, spec);
///     const std::string subject = token.get()->GetSubject().ToString();
///
/// `get` throws the operation's failure in its own class, for example `InvalidCredentialsException`. When the operation ends
/// without a call of its completion (see `SecurityTokenService::TokenCompletion`), `get` throws `std::future_error`
/// with the code `std::future_errc::broken_promise`. Destroying the future neither waits for the operation nor cancels
/// it.
///
/// Never wait for a future in a completion of this library, nor in a work item of the platform's thread pool: the operation
/// may need the thread that waits. After `fork`, the child must not wait for a future of its parent, which never becomes ready
/// there.
/// @param operation one of the operations of `SecurityTokenService` with "Async" in their names
/// @param arguments all its arguments except the completion. The operation copies or shares them.
/// @throws what `operation` throws itself, for example Tarvel::InvalidStateException when the pool cannot start a thread.
template <typename... Parameters, typename... Arguments>
auto AsFuture(const SecurityTokenService &service, void (SecurityTokenService::*operation)(Parameters...) const,
              Arguments &&...arguments) {
  static_assert(sizeof...(Parameters) == sizeof...(Arguments) + 1, "give all arguments but the completion");
  using Completion = std::tuple_element_t<sizeof...(Parameters) - 1, std::tuple<Parameters...>>;
  using Result = FutureDetails::ResultOf<Completion>;
  auto promise = std::make_shared<std::promise<typename Result::Type>>();
  auto future = promise->get_future();
  // From here on, only the completion owns the promise. If it is destroyed without having been called, the promise is
  // broken.
  const auto completion = Result::Keep(std::exchange(promise, nullptr));
  (service.*operation)(std::forward<Arguments>(arguments)..., completion);
  return future;
}

} // namespace SsoClient
