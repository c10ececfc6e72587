// SPDX-License-Identifier: Apache-2.0
/// @file
/// The operations whose handlers wait for an execution context. Not for callers.

#pragma once

#include <tarvel/core/fork_safe_mutex.h>

#include <boost/asio/execution/context_as.hpp>
#include <boost/asio/execution_context.hpp>
#include <boost/asio/is_executor.hpp>
#include <boost/asio/query.hpp>
#include <boost/asio/system_executor.hpp>

#include <list>
#include <memory>
#include <mutex>
#include <type_traits>
#include <utility>

/// The parts of the functions for Asio that are not for callers.
namespace SsoClient::Asio::Detail {

/// An operation whose handler has not been called.
class PendingOperation {
public:
  /// Destroys the handler without a call, and cancels the operation.
  virtual void Abandon() noexcept = 0;

protected:
  PendingOperation() = default;
  PendingOperation(const PendingOperation &) = default;
  PendingOperation &operator=(const PendingOperation &) = default;
  ~PendingOperation() = default;
};

/// The pending operations of one execution context. The context and the operations share this list. The thread that
/// ends an operation must not use a context that has been destroyed. So the end of the operation and the end of the
/// context compete for the operation in this list.
class PendingOperations {
public:
  using Operations = std::list<std::shared_ptr<PendingOperation>>;
  using Place = Operations::iterator;

  /// @throws std::bad_alloc
  Place Add(std::shared_ptr<PendingOperation> operation) {
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    return m_operations.insert(m_operations.end(), std::move(operation));
  }

  /// Removes the operation and calls `use`, during which the context exists. Does nothing when the context has ended.
  template <typename Use>
  void Remove(Place place, const Use &use) {
    Operations removed; // destroyed after the lock
    const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
    if (!m_isClosed) {
      removed.splice(removed.end(), m_operations, place);
      use();
    }
  }

  /// Abandons all operations: the context is being destroyed, or they belong to the parent of this process.
  void AbandonAll(bool isClosing) noexcept {
    Operations abandoned;
    {
      const std::lock_guard<Tarvel::ForkSafeMutex> lock(m_mutex);
      m_isClosed = m_isClosed || isClosing;
      abandoned.swap(m_operations);
    }
    for (const std::shared_ptr<PendingOperation> &operation : abandoned) {
      operation->Abandon();
    }
  }

private:
  Tarvel::ForkSafeMutex m_mutex;
  bool m_isClosed = false; // guarded by m_mutex, like the list
  Operations m_operations;
};

/// Abandons the pending operations of an execution context when the context is destroyed. Asio prescribes the names in
/// lower case.
class PendingOperationsService final : public boost::asio::execution_context::service {
public:
  using key_type = PendingOperationsService; // NOLINT(readability-identifier-naming)

  inline static boost::asio::execution_context::id id; // NOLINT(readability-identifier-naming)

  explicit PendingOperationsService(boost::asio::execution_context &context)
      : boost::asio::execution_context::service(context) {}

  const std::shared_ptr<PendingOperations> &GetOperations() const noexcept { return m_operations; }

private:
  void shutdown() override { m_operations->AbandonAll(true); } // NOLINT(readability-identifier-naming)

  // NOLINTNEXTLINE(readability-identifier-naming)
  void notify_fork(boost::asio::execution_context::fork_event event) override {
    // In the child, no operation of the parent ends. The context would wait for them for ever.
    if (event == boost::asio::execution_context::fork_child) {
      m_operations->AbandonAll(false);
    }
  }

  const std::shared_ptr<PendingOperations> m_operations = std::make_shared<PendingOperations>();
};

/// The pending operations of the context of `executor`; a separate list if the executor has no context. Asio's system
/// context is not used, because it starts threads when it is first used.
template <typename Executor>
std::shared_ptr<PendingOperations> PendingOperationsOf(const Executor &executor) {
  using boost::asio::execution_context;
  using ContextProperty = boost::asio::execution::context_as_t<execution_context &>;
  if constexpr (std::is_same_v<Executor, boost::asio::system_executor>) {
    return std::make_shared<PendingOperations>();
  } else if constexpr (boost::asio::can_query<const Executor &, ContextProperty>::value) {
    execution_context &context = boost::asio::query(executor, ContextProperty());
    return boost::asio::use_service<PendingOperationsService>(context).GetOperations();
  } else if constexpr (boost::asio::is_executor<Executor>::value) {
    execution_context &context = executor.context();
    return boost::asio::use_service<PendingOperationsService>(context).GetOperations();
  } else {
    return std::make_shared<PendingOperations>();
  }
}

} // namespace SsoClient::Asio::Detail
