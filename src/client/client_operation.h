// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ClientOperation`, one operation of a `TokenClient`.

#pragma once

#include "client/client_core.h"
#include "client/client_task.h"
#include "operation/operation_events.h"
#include "operation/operation_frame.h"

#include <ssoclient/client/call_options.h>
#include <ssoclient/client/cancellation.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/fork_safe_mutex.h>
#include <tarvel/system/scheduled_item.h>
#include <tarvel/system/thread_pool.h>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>

namespace SsoClient {

/// How an operation ended.
struct OperationEnding {
  std::exception_ptr failure;             ///< null for a success
  std::shared_ptr<const SamlToken> token; ///< the result of a success; null after a validation
  bool isValid = false;                   ///< the result of a validation
};

/// A sequence of steps: compose, send, read; in a negotiation also the legs of the handler. Each step queues the next
/// one, so no thread of a pool waits for the network.
///
/// Cancelling, the deadline, the end of the client and the regular end compete to decide how the operation ends. The
/// first one decides, and the others do nothing. A step that runs at the decision continues without effect: it sends
/// nothing more, and no step follows. The observer's `OnEnded` is called before the outcome is delivered, and no event
/// follows `OnEnded`. Secrets are released at the decision, or, if a step uses them, at the end of that step.
///
/// In a child of `fork`, the operations of the parent do nothing.
class ClientOperation final : public std::enable_shared_from_this<ClientOperation>, private EventsEndListener {
public:
  /// Called once with the ending.
  using Completion = std::function<void(OperationEnding &&ending)>;

  /// Reports the start.
  ClientOperation(std::shared_ptr<ClientCore> core, ClientTask task, const CallOptions &options);
  ClientOperation(const ClientOperation &) = delete;
  ClientOperation &operator=(const ClientOperation &) = delete;
  ~ClientOperation() = default;

  /// Starts the operation. `completion` is called on the executor, or, if `isHere`, wherever the operation ends. What it
  /// throws is logged.
  /// @throws what keeps it from starting, such as a lack of memory or threads. `completion` is not called then.
  void Start(Completion completion, bool isHere = false);

  /// Runs the operation: its steps run in this call, except those that may take long.
  /// @throws the failure with which it ended.
  OperationEnding RunToEnd();

  /// Ends the operation with `failure`, unless its end has been decided.
  void Cancel(std::exception_ptr failure) noexcept;

  /// The place in the client's list; used under the lock of the list.
  boost::optional<OperationList::iterator> place;

private:
  using Clock = CallOptions::Clock;
  /// Runs a part of the operation. @return the ending, if this step decides it.
  using Step = boost::optional<OperationEnding> (ClientOperation::*)();
  using Item = Tarvel::Ref<Tarvel::System::ScheduledItem>;

  /// Where a step runs.
  enum class Place {
    COMPUTING, ///< on the thread that waits, or on the pool for computations
    LONG,      ///< on the pool for computations, because it may take long
    BLOCKING   ///< on the pool for work that blocks
  };

  /// What ends with the decision.
  struct Held {
    Item request;
    Item deadline;
    Item messageLimit;
    Item retry;
    std::shared_ptr<TransportSession> session; // of the request
    CancelRegistration registration;
  };

  /// What may be secret.
  struct Secrets {
    std::unique_ptr<ClientTask> task;
    std::shared_ptr<NegotiationHandler> handler;
    SPNegoResponse spnego;
    Tarvel::Ref<Tarvel::Reader> response;
  };

  /// A thread that waits for the operation.
  struct Waiter {
    std::condition_variable_any changed;
    Step step = nullptr;     // to be run by the thread
    bool mustFinish = false; // set back by the thread when it begins to finish
    bool isOver = false;
  };

  // The steps.
  boost::optional<OperationEnding> Compose();
  boost::optional<OperationEnding> AskHandler();
  boost::optional<OperationEnding> ReadResponse();
  boost::optional<OperationEnding> VerifyNegotiated();

  // Parts of steps.
  OperationEnding ReadResult();
  boost::optional<OperationEnding> ReadLeg();
  static OperationEnding EndWithToken(std::shared_ptr<const SamlToken> token);
  void ForgetTask() noexcept;
  void Send(Request request);
  void StartMessageLimit(unsigned exchange, Clock::time_point end);
  void KeepRequest(unsigned exchange, const Item &item) noexcept;
  void OnResponse(const Tarvel::Exception *failure, Tarvel::Reader *response) noexcept;
  void OnMessageLimit(unsigned exchange) noexcept;
  bool RetryLater();
  void StartAgain() noexcept;

  // How the operation starts.
  std::shared_ptr<const TokenSteps> FindSteps(const CallOptions &options);
  void Launch();
  void StartDeadlineTimer();
  void RegisterCancel();
  void Keep(Item Held::*member, Item item) noexcept;

  // How steps are run.
  void ScheduleFirst();
  void Schedule(Step step, Place where);
  void RunStep(Step step, bool isOnComputePool) noexcept;
  bool BeginStep() noexcept;
  void EndStep(bool isOnComputePool) noexcept;
  bool IsDecided() const noexcept;
  bool WaitForChange(std::unique_lock<Tarvel::ForkSafeMutex> &lock);
  void OnWaitLimit() noexcept;

  // How it ends.
  bool Decide(OperationEnding ending, bool isByStep) noexcept;
  void FinishElsewhere() noexcept;
  void Finish(bool isOnComputePool) noexcept;
  void OnEventsEnded() noexcept override;
  void Deliver(bool isOnComputePool) noexcept;
  void Complete() noexcept;
  bool Abandon(std::exception_ptr failure) noexcept;
  bool IsOfParent() const noexcept { return m_generation != Tarvel::GetForkGeneration(); }

  const unsigned m_generation = Tarvel::GetForkGeneration();
  const std::shared_ptr<ClientCore> m_core;
  const std::shared_ptr<OperationObserver> m_observer;
  const TaskKind m_kind;
  const boost::optional<Clock::time_point> m_deadline;
  const RetryPolicy m_retryPolicy;
  const Executor m_executor;
  CancelToken m_cancelToken;
  Secrets m_secrets;            // used by the step that runs
  std::exception_ptr m_refusal; // of the options of the call
  const std::shared_ptr<const TokenSteps> m_steps;
  // The start is reported when all that may fail has been made. Otherwise no end would follow it.
  OperationFrame m_frame;
  OperationEvents m_events;

  // Used by the step that runs.
  std::shared_ptr<TransportSession> m_session;
  std::shared_ptr<ResponseFacts> m_facts;
  std::exception_ptr m_responseFailure;
  int m_attempt = 1;
  int m_leg = 0;

  mutable Tarvel::ForkSafeMutex m_mutex; // guards what follows
  bool m_isDecided = false;
  bool m_isDecidedByStep = false; // then the operation finishes when no step runs, otherwise at once
  int m_runningSteps = 0;
  unsigned m_exchange = 0;                                   // the number of the last request
  bool m_isLate = false;                                     // its time-out has passed
  Clock::time_point m_messageEnd = Clock::time_point::max(); // when its time-out passes
  Held m_held;
  OperationEnding m_ending; // set at the decision
  Completion m_completion;
  bool m_completesHere = false;
  std::unique_ptr<Waiter> m_waiter; // null unless a thread waits
};

/// The failure of the operations of a client that is destroyed.
std::exception_ptr MakeClientDestroyed() noexcept;

} // namespace SsoClient
