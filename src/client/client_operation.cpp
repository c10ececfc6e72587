// SPDX-License-Identifier: Apache-2.0
// How an operation starts, how its steps are run, and how it ends.
#include "client/client_operation.h"

#include "client/delivery.h"
#include "client/retry.h"
#include "operation/caught_exception.h"

#include <ssoclient/client/exceptions.h>

#include <mutex>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::ForkSafeMutex;
using Tarvel::System::GetComputePool;
using Tarvel::System::GetThreadPool;

/// An exception; `std::bad_alloc` if there is no memory for it.
template <typename Failure>
std::exception_ptr MakeFailure(const char *message) noexcept {
  try {
    throw Failure(message);
  } catch (...) {
    return std::current_exception();
  }
}

std::exception_ptr Cancelled() noexcept {
  return MakeFailure<CancelledException>("The operation was cancelled");
}

std::exception_ptr Late() noexcept {
  return MakeFailure<DeadlineExceededException>("The deadline passed before the operation ended");
}

} // namespace

std::exception_ptr MakeClientDestroyed() noexcept {
  return MakeFailure<CancelledException>("The operation was cancelled because its client was destroyed");
}

ClientOperation::ClientOperation(std::shared_ptr<ClientCore> core, ClientTask task, const CallOptions &options)
    : m_core(std::move(core)), m_observer(options.observer ? options.observer : m_core->GetOptions().service.observer),
      m_kind(KindOf(task)), m_deadline(options.deadline),
      m_retryPolicy(options.retryPolicy.value_or(m_core->GetOptions().retryPolicy)),
      m_executor(options.executor ? options.executor : m_core->GetOptions().executor),
      m_cancelToken(options.cancelToken), m_secrets{std::make_unique<ClientTask>(std::move(task)), {}, {}, {}},
      m_steps(FindSteps(options)), m_frame(NameOf(*m_secrets.task), CLIENT_LINES),
      m_events(m_observer.get(), NameOf(*m_secrets.task), m_frame.GetId()) {}

/// Null when the options are refused.
std::shared_ptr<const TokenSteps> ClientOperation::FindSteps(const CallOptions &options) {
  try {
    CheckRetryPolicy(m_retryPolicy);
    return m_core->GetSteps(options);
  } catch (const Tarvel::Exception &) {
    m_refusal = std::current_exception();
    return nullptr;
  }
}

void ClientOperation::Start(Completion completion, bool isHere) {
  m_completion = std::move(completion);
  m_completesHere = isHere;
  Launch();
}

OperationEnding ClientOperation::RunToEnd() {
  try {
    m_waiter = std::make_unique<Waiter>();
  } catch (...) {
    Abandon(std::current_exception());
    throw;
  }
  Launch();
  std::unique_lock<ForkSafeMutex> lock(m_mutex);
  while (!m_waiter->isOver) {
    if (IsOfParent()) {
      throw CommunicationException("The operation was under way when the process forked: its parent goes on with it");
    }
    if (std::exchange(m_waiter->mustFinish, false)) {
      lock.unlock();
      Finish(false);
      lock.lock();
    } else if (const Step step = m_isDecided ? nullptr : std::exchange(m_waiter->step, nullptr)) {
      lock.unlock();
      RunStep(step, false);
      lock.lock();
    } else if (!WaitForChange(lock)) {
      lock.unlock();
      OnWaitLimit();
      lock.lock();
    }
  }
  lock.unlock();
  OperationEnding ending = std::move(m_ending);
  if (ending.failure) {
    std::rethrow_exception(std::move(ending.failure));
  }
  return ending;
}

/// @return false when the deadline or the time for the message has passed.
bool ClientOperation::WaitForChange(std::unique_lock<ForkSafeMutex> &lock) {
  Clock::time_point limit = m_isDecided ? Clock::time_point::max() : m_messageEnd;
  if (!m_isDecided && m_deadline && *m_deadline < limit) {
    limit = *m_deadline;
  }
  if (limit == Clock::time_point::max()) {
    m_waiter->changed.wait(lock);
    return true;
  }
  const Clock::duration remaining = limit - m_core->GetTime().GetSteadyTime();
  return m_waiter->changed.wait_until(lock, Clock::now() + remaining) == std::cv_status::no_timeout;
}

void ClientOperation::OnWaitLimit() noexcept {
  const Clock::time_point now = m_core->GetTime().GetSteadyTime();
  if (m_deadline && now >= *m_deadline) {
    Cancel(Late());
    return;
  }
  unsigned exchange = 0;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (now < m_messageEnd) {
      return;
    }
    exchange = m_exchange;
  }
  OnMessageLimit(exchange);
}

void ClientOperation::Launch() {
  try {
    if (m_cancelToken.IsCancelled()) {
      Cancel(Cancelled());
    } else if (m_deadline && *m_deadline <= m_core->GetTime().GetSteadyTime()) {
      Cancel(Late());
    } else if (m_refusal) {
      Cancel(std::move(m_refusal));
    } else if (!m_core->Add(shared_from_this())) {
      Cancel(MakeClientDestroyed());
    } else {
      StartDeadlineTimer();
      RegisterCancel();
      ScheduleFirst();
    }
  } catch (...) {
    if (Abandon(std::current_exception())) {
      throw;
    }
  }
}

void ClientOperation::StartDeadlineTimer() {
  if (m_deadline && !m_waiter) {
    Keep(&Held::deadline, m_core->GetTime().StartTimer(*m_deadline, [weak = weak_from_this()] {
      if (const auto self = weak.lock()) {
        self->Cancel(Late());
      }
    }));
  }
}

void ClientOperation::RegisterCancel() {
  if (!m_cancelToken.CanBeCancelled()) {
    return;
  }
  CancelRegistration registration = m_cancelToken.OnCancel([weak = weak_from_this()] {
    if (const auto self = weak.lock()) {
      self->Cancel(Cancelled());
    }
  });
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (!m_isDecided) {
    std::swap(m_held.registration, registration);
  }
}

/// Keeps `item` until the decision, which cancels it.
void ClientOperation::Keep(Item Held::*member, Item item) noexcept {
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (!m_isDecided) {
      std::swap(m_held.*member, item);
      return;
    }
  }
  item->Cancel();
}

void ClientOperation::ScheduleFirst() {
  if (m_kind == TaskKind::NEGOTIATE) {
    Schedule(&ClientOperation::AskHandler, Place::BLOCKING);
  } else {
    Schedule(&ClientOperation::Compose, Place::COMPUTING);
  }
}

void ClientOperation::Schedule(Step step, Place where) {
  if (m_waiter && where == Place::COMPUTING) {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_waiter->step = step;
    m_waiter->changed.notify_one();
    return;
  }
  const bool isBlocking = where == Place::BLOCKING;
  (isBlocking ? GetThreadPool() : GetComputePool())->QueueWorkItem([self = shared_from_this(), step, isBlocking] {
    self->RunStep(step, !isBlocking);
  });
}

void ClientOperation::RunStep(Step step, bool isOnComputePool) noexcept {
  if (!BeginStep()) {
    return;
  }
  boost::optional<OperationEnding> ending;
  try {
    ending = (this->*step)();
  } catch (...) {
    ending = OperationEnding{std::current_exception(), nullptr, false};
  }
  if (ending) {
    Decide(std::move(*ending), true);
  }
  EndStep(isOnComputePool);
}

/// @return false when the end has been decided.
bool ClientOperation::BeginStep() noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_isDecided || IsOfParent()) {
    return false;
  }
  ++m_runningSteps;
  return true;
}

/// Finishes the operation if a step has decided its end and this was the last to run: a thread that sends can still be in
/// its step when another has read the answer. So the handler is destroyed before a caller gets the result.
void ClientOperation::EndStep(bool isOnComputePool) noexcept {
  bool finishes = false;
  {
    Secrets released; // destroyed outside the lock
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (--m_runningSteps == 0 && m_isDecided) {
      std::swap(released, m_secrets);
      finishes = m_isDecidedByStep;
    }
  }
  if (!finishes) {
    return;
  }
  if (isOnComputePool && !m_waiter) {
    Finish(true);
  } else {
    FinishElsewhere();
  }
}

bool ClientOperation::IsDecided() const noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  return m_isDecided || IsOfParent();
}

void ClientOperation::Cancel(std::exception_ptr failure) noexcept {
  if (Decide({std::move(failure), nullptr, false}, false)) {
    FinishElsewhere();
  }
}

/// Decides how the operation ends. @return false when its end was decided before, and in a child of the process that
///         started it.
bool ClientOperation::Decide(OperationEnding ending, bool isByStep) noexcept {
  Held held;
  Secrets released;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isDecided || IsOfParent()) {
      return false;
    }
    m_isDecided = true;
    m_isDecidedByStep = isByStep;
    m_ending = std::move(ending);
    std::swap(held, m_held);
    if (m_runningSteps == 0) {
      std::swap(released, m_secrets);
    }
  }
  for (const Item &item : {held.request, held.deadline, held.messageLimit, held.retry}) {
    if (item) {
      item->Cancel();
    }
  }
  m_core->Remove(*this);
  return true;
}

/// Finishes on another thread: neither a thread that cancels nor one that must not block should run the host's code. The
/// item is urgent, so that it does not wait for the queued steps of other operations. Called once.
void ClientOperation::FinishElsewhere() noexcept {
  if (m_waiter) {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_waiter->mustFinish = true;
    m_waiter->changed.notify_one();
    return;
  }
  try {
    GetComputePool()->QueueUrgentItem([self = shared_from_this()] { self->Finish(true); });
  } catch (...) {
    Finish(false);
  }
}

void ClientOperation::Finish(bool isOnComputePool) noexcept {
  if (m_events.End(m_ending.failure, *this)) {
    Deliver(isOnComputePool);
  }
}

void ClientOperation::OnEventsEnded() noexcept {
  Deliver(false);
}

void ClientOperation::Deliver(bool isOnComputePool) noexcept {
  if (IsOfParent()) {
    return; // the observer has forked
  }
  m_frame.LogEnd();
  if (m_waiter) {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_waiter->isOver = true;
    m_waiter->changed.notify_one();
    return;
  }
  if (!m_completion) {
    return; // the operation was abandoned
  }
  if (m_completesHere || (isOnComputePool && !m_executor)) {
    Complete();
    return;
  }
  try {
    RunOn(m_executor, [self = shared_from_this()] { self->Complete(); });
  } catch (...) {
    Complete(); // there is no memory
  }
}

void ClientOperation::Complete() noexcept {
  const Completion completion = std::exchange(m_completion, nullptr);
  try {
    completion(std::move(m_ending));
  } catch (...) {
    LogCaughtException("", "A callback", SecretMask());
  }
}

/// Ends an operation that has not started. @return false when its end was decided before.
bool ClientOperation::Abandon(std::exception_ptr failure) noexcept {
  if (!Decide({std::move(failure), nullptr, false}, false)) {
    return false;
  }
  m_completion = nullptr;
  m_waiter = nullptr;
  Finish(false);
  return true;
}

} // namespace SsoClient
