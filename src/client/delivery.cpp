// SPDX-License-Identifier: Apache-2.0

#include "client/delivery.h"

#include "operation/caught_exception.h"

#include <tarvel/core/fork_safe_mutex.h>
#include <tarvel/system/thread_pool.h>

#include <atomic>
#include <memory>
#include <utility>

namespace SsoClient {

namespace {

void Call(const std::function<void()> &function) noexcept {
  try {
    function();
  } catch (...) {
    LogCaughtException("", "A callback", SecretMask());
  }
}

/// A function that runs once, on the first thread that calls `Run`, but not in a child of this process.
class Delivery {
public:
  /// Called before the object is shared.
  void SetFunction(std::function<void()> function) noexcept { m_function = std::move(function); }

  bool IsToRun() const noexcept {
    return m_generation == Tarvel::GetForkGeneration() && !m_isRun.load(std::memory_order_acquire);
  }

  void Run() noexcept {
    if (IsToRun() && !m_isRun.exchange(true, std::memory_order_acq_rel)) {
      Call(std::exchange(m_function, nullptr)); // what the function captures is released on this thread
    }
  }

private:
  const unsigned m_generation = Tarvel::GetForkGeneration();
  std::atomic<bool> m_isRun{false};
  std::function<void()> m_function;
};

void RunOnComputePool(const std::shared_ptr<Delivery> &delivery) noexcept {
  try {
    Tarvel::System::GetComputePool()->QueueUrgentItem([delivery] { delivery->Run(); });
  } catch (...) {
    delivery->Run(); // there is no thread or no memory
  }
}

/// Shared by the copies of the function that an executor gets. If the last copy is destroyed before any copy was
/// called, the executor has dropped the function.
class Order {
public:
  explicit Order(std::shared_ptr<Delivery> delivery) noexcept : m_delivery(std::move(delivery)) {}
  Order(const Order &) = delete;
  Order &operator=(const Order &) = delete;
  ~Order() {
    if (m_delivery->IsToRun()) {
      RunOnComputePool(m_delivery);
    }
  }

  void Run() const noexcept { m_delivery->Run(); }

private:
  const std::shared_ptr<Delivery> m_delivery;
};

/// Empty when there is no memory.
std::function<void()> OrderOf(const std::shared_ptr<Delivery> &delivery) noexcept {
  try {
    return [order = std::make_shared<const Order>(delivery)] { order->Run(); };
  } catch (...) {
    return nullptr;
  }
}

/// Whether the executor has accepted the function. What it throws is logged.
bool IsAccepted(const Executor &executor, std::function<void()> function) noexcept {
  try {
    executor(std::move(function));
    return true;
  } catch (...) {
    LogCaughtException("", "An executor", SecretMask());
    return false;
  }
}

} // namespace

void RunOn(const Executor &executor, std::function<void()> function) noexcept {
  std::shared_ptr<Delivery> delivery;
  try {
    delivery = std::make_shared<Delivery>();
  } catch (...) {
    Call(function); // there is no memory
    return;
  }
  delivery->SetFunction(std::move(function));
  std::function<void()> order = executor ? OrderOf(delivery) : nullptr;
  if (!order || !IsAccepted(executor, std::move(order))) {
    RunOnComputePool(delivery);
  }
}

} // namespace SsoClient
