// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ManualOperation`, an operation that ends when the test calls `End`.

#pragma once

#include <ssoclient/asio/detail/start_operation.h>
#include <ssoclient/client/call_options.h>
#include <ssoclient/client/outcome.h>

#include <exception>
#include <functional>
#include <utility>

namespace Testing {

class ManualOperation {
public:
  /// Starts the operation with a completion token, like the functions of the component.
  template <typename CompletionToken>
  auto Run(CompletionToken &&token, SsoClient::CallOptions options = {}) {
    return SsoClient::Asio::Detail::Initiate<bool>(
        std::move(options), token, [this](const SsoClient::CallOptions &call, SsoClient::ValidityCallback callback) {
          started = call;
          m_callback = std::move(callback);
          if (onStart) {
            onStart();
          }
        });
  }

  bool IsUnderWay() const { return m_callback != nullptr; }

  void End(const SsoClient::ValidityOutcome &outcome) { std::exchange(m_callback, nullptr)(outcome); }

  SsoClient::CallOptions started; ///< the options with which it was started
  std::function<void()> onStart;  ///< called within the start

private:
  SsoClient::ValidityCallback m_callback;
};

/// How often a handler was called, and the arguments of its last call.
class HandlerCalls {
public:
  auto MakeHandler() {
    return [this](const std::exception_ptr &exception, bool result) {
      ++count;
      failure = exception;
      value = result;
    };
  }

  int count = 0;
  std::exception_ptr failure;
  bool value = false;
};

} // namespace Testing
