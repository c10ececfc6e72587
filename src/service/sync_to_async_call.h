// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one way in which a synchronous operation becomes an asynchronous one.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/core/exception.h>
#include <tarvel/system/thread_pool.h>

#include <memory>
#include <utility>

namespace SsoClient {

/// Stands for a reference argument in a call that runs later, and keeps the object alive until the call is destroyed.
template <typename T>
class PassByRefHelper {
public:
  explicit PassByRefHelper(std::shared_ptr<T> object) : m_object(std::move(object)) {}

  /// @throws Tarvel::InvalidArgumentException when there is no object; here, where the operation runs, so that its caller
  ///         hears of it as of any other failure.
  operator T &() const {
    if (!m_object) {
      throw Tarvel::InvalidArgumentException("a required object may not be NULL");
    }
    return *m_object;
  }

private:
  std::shared_ptr<T> m_object;
};

/// Runs `call` and tells `callback` how it ended: its result and null, or `failureValue` and the exception, which is good
/// during the callback only. What `callback` throws leaves this function, and so does what `call` throws that is no
/// `Tarvel::Exception`; in that case `callback` is not called.
template <typename Call, typename Callback, typename FailureValue>
void SyncCallToResultFunc(const Call &call, const Callback &callback, const FailureValue &failureValue) {
  FailureValue result = failureValue;
  try {
    result = call();
  } catch (const Tarvel::Exception &failure) {
    callback(failureValue, &failure);
    return;
  }
  // Not within the block above: an exception of the callback is no failure of the call, to be reported to it again.
  callback(result, nullptr);
}

/// Queues `SyncCallToResultFunc` of copies of the three on the platform's thread pool and returns at once. The copies are
/// destroyed when the work has run.
/// @throws Tarvel::InvalidStateException when the pool has no thread and can start none; nothing is called then.
template <typename Call, typename Callback, typename FailureValue>
void SyncToAsyncCall(const Call &call, const Callback &callback, const FailureValue &failureValue) {
  Tarvel::System::GetThreadPool()->QueueWorkItem(
      [call, callback, failureValue] { SyncCallToResultFunc(call, callback, failureValue); });
}

/// The same for calls whose result is a token; null tells of failure.
template <typename Call, typename Callback>
void SyncToAsyncCall(const Call &call, const Callback &callback) {
  SyncToAsyncCall(call, callback, std::shared_ptr<const SamlToken>());
}

} // namespace SsoClient
