// SPDX-License-Identifier: Apache-2.0
/// @file
/// Starts an operation whose outcome a handler of Asio receives. Not for callers.

#pragma once

#include <ssoclient/asio/detail/pending_operations.h>
#include <ssoclient/client/cancellation.h>
#include <ssoclient/client/outcome.h>

#include <boost/asio/associated_allocator.hpp>
#include <boost/asio/associated_executor.hpp>
#include <boost/asio/async_result.hpp>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/system_executor.hpp>
#include <boost/asio/version.hpp>
#if BOOST_ASIO_VERSION >= 101900
/// Defined where Asio has cancellation slots, from Boost 1.77 on.
#define SSOCLIENT_ASIO_HAS_CANCELLATION_SLOTS 1
#include <boost/asio/associated_cancellation_slot.hpp>
#include <boost/asio/cancellation_type.hpp>
#endif

#include <boost/optional.hpp>

#include <exception>
#include <memory>
#include <type_traits>
#include <utility>

namespace SsoClient::Asio::Detail {

/// A handler and the outcome that it is called with. Asio prescribes the names in lower case.
template <typename Value, typename Handler>
class BoundHandler {
public:
  using allocator_type = boost::asio::associated_allocator_t<Handler>; // NOLINT(readability-identifier-naming)

  BoundHandler(Handler handler, Outcome<Value> outcome)
      : m_handler(std::move(handler)), m_outcome(std::move(outcome)) {}

  // NOLINTNEXTLINE(readability-identifier-naming)
  allocator_type get_allocator() const noexcept { return boost::asio::get_associated_allocator(m_handler); }

  void operator()() {
    if (m_outcome.HasValue()) {
      std::move(m_handler)(std::exception_ptr(), Value(m_outcome.Get()));
    } else {
      std::move(m_handler)(std::exception_ptr(m_outcome.GetException()), Value());
    }
  }

private:
  Handler m_handler;
  Outcome<Value> m_outcome;
};

/// An operation and the handler that waits for it. The memory of this object is not from the handler's allocator: the
/// library may share the object until after the call of the handler, when the allocator may have been destroyed.
template <typename Value, typename Handler>
class HandledOperation final : public PendingOperation {
public:
  using Executor = boost::asio::associated_executor_t<Handler>;
  using Bound = BoundHandler<Value, Handler>;

  explicit HandledOperation(Handler handler)
      : m_handler(std::move(handler)), m_work(boost::asio::get_associated_executor(*m_handler)),
        m_pending(PendingOperationsOf(m_work->get_executor())) {
#ifdef SSOCLIENT_ASIO_HAS_CANCELLATION_SLOTS
    auto slot = boost::asio::get_associated_cancellation_slot(*m_handler);
    if (slot.is_connected()) {
      slot.assign([source = m_cancelSource](boost::asio::cancellation_type type) {
        if (type != boost::asio::cancellation_type::none) {
          source.Cancel();
        }
      });
    }
#endif
  }

  static void Register(const std::shared_ptr<HandledOperation> &operation) {
    operation->m_place = operation->m_pending->Add(operation);
  }

  CancelToken GetCancelToken() const noexcept {
    return m_cancelSource.GetToken();
  }

  /// Makes the handler's executor call the handler, never in this call.
  void Post(const Outcome<Value> &outcome) {
    m_pending->Remove(m_place, [this, &outcome] {
      boost::asio::post(m_work->get_executor(), Take(outcome));
      m_work.reset();
    });
  }

  /// Like `Post`, but a handler without an executor is called in this call.
  void Complete(const Outcome<Value> &outcome) {
    if constexpr (std::is_same_v<Executor, boost::asio::system_executor>) {
      boost::optional<Bound> bound;
      m_pending->Remove(m_place, [this, &outcome, &bound] { bound.emplace(Take(outcome)); });
      if (bound) {
        (*bound)();
      }
    } else {
      Post(outcome);
    }
  }

  void Abandon() noexcept override {
    m_handler.reset();
    m_work.reset();
    m_cancelSource.Cancel();
  }

private:
  Bound Take(const Outcome<Value> &outcome) {
    Bound bound(std::move(*m_handler), outcome);
    m_handler.reset();
    return bound;
  }

  boost::optional<Handler> m_handler;
  // Executors such as strands use their context until they are destroyed.
  boost::optional<boost::asio::executor_work_guard<Executor>> m_work;
  const std::shared_ptr<PendingOperations> m_pending;
  PendingOperations::Place m_place;
  const CancelSource m_cancelSource;
};

/// Calls `start` with a token that cancels the operation, and with a callback that passes the outcome to `handler`.
template <typename Value, typename Handler, typename Start>
void StartOperation(Handler &&handler, const CancelToken &cancelToken, const Start &start) {
  using Operation = HandledOperation<Value, std::decay_t<Handler>>;
  const auto operation = std::make_shared<Operation>(std::forward<Handler>(handler));
  Operation::Register(operation);
  try {
    start(CancelToken::AnyOf(cancelToken, operation->GetCancelToken()),
          [operation](const Outcome<Value> &outcome) { operation->Complete(outcome); });
  } catch (...) {
    operation->Post(std::current_exception());
  }
}

/// Starts an operation with a completion token. Its handler gets an exception, null for a success, and a `Value`.
/// @param options its cancel token and that of the handler cancel the operation
/// @param start starts the operation with these options, but without their executor, and with a callback
template <typename Value, typename Options, typename CompletionToken, typename Start>
auto Initiate(Options options, CompletionToken &&token, Start start) {
  return boost::asio::async_initiate<CompletionToken, void(std::exception_ptr, Value)>(
      [options = std::move(options), start = std::move(start)](auto &&handler) mutable {
        options.executor = nullptr;
        StartOperation<Value>(std::forward<decltype(handler)>(handler), CancelToken(options.cancelToken),
                              [&options, &start](const CancelToken &cancelToken, auto callback) {
                                options.cancelToken = cancelToken;
                                start(options, std::move(callback));
                              });
      },
      token);
}

} // namespace SsoClient::Asio::Detail
