// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs a synchronous operation on the thread pool and reports how it ended.

#pragma once

#include "operation/required_object.h"

#include <ssoclient/saml_token.h>
#include <tarvel/core/exception.h>
#include <tarvel/system/thread_pool.h>

#include <memory>
#include <utility>

namespace SsoClient {

/// A reference argument of a call that runs later. It keeps the object alive until the call is destroyed.
template <typename T>
class PassByRefHelper {
public:
  explicit PassByRefHelper(std::shared_ptr<T> object) : m_object(std::move(object)) {}

  /// @throws Tarvel::InvalidArgumentException when there is no object. It is thrown here, where the operation runs, so that
  ///         it is reported like any other failure.
  operator T &() const { return Required(m_object); }

private:
  std::shared_ptr<T> m_object;
};

/// Runs `call`, then `callback` with the result and null, or with `failureValue` and the exception, which is valid during the
/// callback only. What `callback` throws leaves this function. An exception of `call` that is not a
/// `Tarvel::Exception` leaves it, too; `callback` is then not called.
template <typename Call, typename Callback, typename FailureValue>
void SyncCallToResultFunc(const Call &call, const Callback &callback, const FailureValue &failureValue) {
  FailureValue result = failureValue;
  try {
    result = call();
  } catch (const Tarvel::Exception &failure) {
    callback(failureValue, &failure);
    return;
  }
  // Outside the try block: an exception of the callback is not a failure of the call, and not reported to the callback.
  callback(result, nullptr);
}

/// Copies the arguments, queues `SyncCallToResultFunc` with the copies on the platform's thread pool, and returns at
/// once. The copies are destroyed when the work has run.
/// @throws Tarvel::InvalidStateException when the pool has no thread and cannot start one. Nothing is called then.
template <typename Call, typename Callback, typename FailureValue>
void SyncToAsyncCall(const Call &call, const Callback &callback, const FailureValue &failureValue) {
  Tarvel::System::GetThreadPool()->QueueWorkItem(
      [call, callback, failureValue] { SyncCallToResultFunc(call, callback, failureValue); });
}

/// The same for calls whose result is a token. The failure value is null.
template <typename Call, typename Callback>
void SyncToAsyncCall(const Call &call, const Callback &callback) {
  SyncToAsyncCall(call, callback, std::shared_ptr<const SamlToken>());
}

} // namespace SsoClient
