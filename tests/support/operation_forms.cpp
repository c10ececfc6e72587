// SPDX-License-Identifier: Apache-2.0

#include "support/operation_forms.h"

#include <exception>
#include <functional>
#include <utility>

namespace Testing {

namespace {

using SsoClient::CallOptions;
using SsoClient::TokenClient;

#ifdef SSOCLIENT_HAS_COROUTINES
/// A coroutine that starts at once, and destroys its frame when it ends.
struct Detached {
  struct promise_type {
    Detached get_return_object() const noexcept { return {}; }
    std::suspend_never initial_suspend() const noexcept { return {}; }
    std::suspend_never final_suspend() const noexcept { return {}; }
    void return_void() const noexcept {}
    void unhandled_exception() const noexcept { std::terminate(); }
  };
};

template <typename Value>
Detached FulfilBy(SsoClient::Awaitable<Value> operation, std::shared_ptr<std::promise<Value>> promise) {
  try {
    promise->set_value(co_await operation);
  } catch (...) {
    promise->set_exception(std::current_exception());
  }
}
#endif

template <typename Value>
struct FormsOf {
  std::function<Value()> wait;
  std::function<void(std::function<void(const SsoClient::Outcome<Value> &)>)> callBack;
  std::function<std::future<Value>()> future;
#ifdef SSOCLIENT_HAS_COROUTINES
  std::function<SsoClient::Awaitable<Value>()> awaitable;
#endif
};

template <typename Value>
Value Run(Form form, const FormsOf<Value> &forms) {
  const auto promise = std::make_shared<std::promise<Value>>();
  switch (form) {
  case Form::WAITING:
    return forms.wait();
  case Form::FUTURE:
    return Await(forms.future());
  case Form::CALLBACK:
    forms.callBack(Fulfil(promise));
    break;
  case Form::AWAITABLE:
#ifdef SSOCLIENT_HAS_COROUTINES
    FulfilBy(forms.awaitable(), promise);
#else
    throw std::logic_error("this compiler has no coroutines");
#endif
    break;
  }
  return Await(promise->get_future());
}

} // namespace

std::vector<Form> AllForms() {
#ifdef SSOCLIENT_HAS_COROUTINES
  return {Form::WAITING, Form::CALLBACK, Form::FUTURE, Form::AWAITABLE};
#else
  return {Form::WAITING, Form::CALLBACK, Form::FUTURE};
#endif
}

std::string NameOf(Form form) {
  return form == Form::WAITING    ? "Waiting"
         : form == Form::CALLBACK ? "Callback"
         : form == Form::FUTURE   ? "Future"
                                  : "Awaitable";
}

TokenPtr Acquire(Form form, const TokenClient &client, const SsoClient::Credential &credential,
                 const SsoClient::TokenSpec &spec, const CallOptions &options) {
  FormsOf<TokenPtr> forms;
  forms.wait = [&] { return client.Acquire(credential, spec, options); };
  forms.callBack = [&](auto callback) { client.AcquireAsync(credential, spec, options, std::move(callback)); };
  forms.future = [&] { return client.AcquireFuture(credential, spec, options); };
#ifdef SSOCLIENT_HAS_COROUTINES
  forms.awaitable = [&] { return client.AcquireAwaitable(credential, spec, options); };
#endif
  return Run(form, forms);
}

TokenPtr Renew(Form form, const TokenClient &client, const TokenPtr &token, std::int64_t lifetimeSec,
               const CallOptions &options) {
  FormsOf<TokenPtr> forms;
  forms.wait = [&] { return client.Renew(token, lifetimeSec, options); };
  forms.callBack = [&](auto callback) { client.RenewAsync(token, lifetimeSec, options, std::move(callback)); };
  forms.future = [&] { return client.RenewFuture(token, lifetimeSec, options); };
#ifdef SSOCLIENT_HAS_COROUTINES
  forms.awaitable = [&] { return client.RenewAwaitable(token, lifetimeSec, options); };
#endif
  return Run(form, forms);
}

bool Validate(Form form, const TokenClient &client, const TokenPtr &token, const CallOptions &options) {
  FormsOf<bool> forms;
  forms.wait = [&] { return client.Validate(token, options); };
  forms.callBack = [&](auto callback) { client.ValidateAsync(token, options, std::move(callback)); };
  forms.future = [&] { return client.ValidateFuture(token, options); };
#ifdef SSOCLIENT_HAS_COROUTINES
  forms.awaitable = [&] { return client.ValidateAwaitable(token, options); };
#endif
  return Run(form, forms);
}

TokenPtr Get(Form form, const SsoClient::TokenSource &source, const SsoClient::GetOptions &options) {
  FormsOf<TokenPtr> forms;
  forms.wait = [&] { return source.Get(options); };
  forms.callBack = [&](auto callback) { source.GetAsync(options, std::move(callback)); };
  forms.future = [&] { return source.GetFuture(options); };
#ifdef SSOCLIENT_HAS_COROUTINES
  forms.awaitable = [&] { return source.GetAwaitable(options); };
#endif
  return Run(form, forms);
}

} // namespace Testing
