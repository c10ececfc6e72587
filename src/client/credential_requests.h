// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CredentialRequests`, which asks the provider of a source for credentials, one call at a time.

#pragma once

#include <ssoclient/client/executor.h>
#include <ssoclient/client/outcome.h>
#include <ssoclient/client/token_source.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <functional>
#include <memory>

namespace SsoClient {

/// A provider may block for ever, but an attempt ends at its deadline. So a call of the provider does not belong to an
/// attempt. While a call is under way, no other call begins, and the attempt that waits when the call ends gets its
/// result.
class CredentialRequests : public std::enable_shared_from_this<CredentialRequests> {
public:
  using Callback = std::function<void(const Outcome<std::shared_ptr<const Credential>> &)>;

  /// @param blocking runs functions that may block
  CredentialRequests(CredentialProvider provider, Executor blocking);

  /// Calls `callback` with the next credential, on the thread of the provider. It replaces an earlier callback that still waits.
  /// After `Close` it does nothing.
  /// @throws what the executor throws, `std::bad_alloc`; the callback is not called then
  void Request(Callback callback);

  /// From now on, no call of the provider or of a callback begins. One that is just beginning on another thread
  /// continues.
  void Close() noexcept;

  /// In a child of `fork`: the call of the parent does not exist here.
  void ForgetCall() noexcept;

private:
  bool IsClosed() noexcept;
  void Call() noexcept;

  const CredentialProvider m_provider;
  const Executor m_blocking;
  Tarvel::ForkSafeMutex m_mutex; // guards all that follows
  Callback m_waiting;            // null if no attempt waits
  bool m_isCalling = false;
  bool m_isClosed = false;
};

} // namespace SsoClient
