// SPDX-License-Identifier: Apache-2.0
/// @file
/// The forms in which an operation of `TokenClient` or `TokenSource` can be run, with one function for each operation.
/// Each function waits for the outcome, and throws a failure in its own class.

#pragma once

#include "support/completion.h"
#include "support/kept_exception.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>

#include <future>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace Testing {

using TokenPtr = std::shared_ptr<const SsoClient::SamlToken>;

enum class Form { WAITING, CALLBACK, FUTURE, AWAITABLE };

/// The forms that this compiler supports.
std::vector<Form> AllForms();

/// "Waiting", "Callback", "Future", "Awaitable".
std::string NameOf(Form form);

TokenPtr Acquire(Form form, const SsoClient::TokenClient &client, const SsoClient::Credential &credential,
                 const SsoClient::TokenSpec &spec, const SsoClient::CallOptions &options = {});
TokenPtr Renew(Form form, const SsoClient::TokenClient &client, const TokenPtr &token, std::int64_t lifetimeSec,
               const SsoClient::CallOptions &options = {});
bool Validate(Form form, const SsoClient::TokenClient &client, const TokenPtr &token,
              const SsoClient::CallOptions &options = {});
TokenPtr Get(Form form, const SsoClient::TokenSource &source, const SsoClient::GetOptions &options = {});

/// Waits for an outcome; throws std::runtime_error if there is none in time.
template <typename Value>
Value Await(std::future<Value> future) {
  if (future.wait_for(PATIENCE) != std::future_status::ready) {
    throw std::runtime_error("no outcome");
  }
  try {
    return future.get();
  } catch (...) {
    KeepForThreadSanitizer(std::current_exception());
    throw;
  }
}

/// A callback that fulfils `promise`; a second call throws std::future_error.
template <typename Value>
auto Fulfil(const std::shared_ptr<std::promise<Value>> &promise) {
  return [promise](const SsoClient::Outcome<Value> &outcome) {
    if (outcome.HasValue()) {
      promise->set_value(outcome.Get());
    } else {
      promise->set_exception(outcome.GetException());
    }
  };
}

} // namespace Testing
