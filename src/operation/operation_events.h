// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationEvents`, through which an operation reports to its observer.

#pragma once

#include "exchange/fault_listener.h"
#include "exchange/request.h"
#include "exchange/response_handler.h"
#include "operation/caught_exception.h"
#include "operation/secret_mask.h"
#include "transport/transport.h"

#include <ssoclient/operation_observer.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <memory>
#include <string>
#include <type_traits>
#include <typeinfo>
#include <utility>
#include <vector>

namespace SsoClient {

/// Is called after the end of an operation has been reported.
class EventsEndListener {
public:
  /// No event of the operation follows this call.
  virtual void OnEventsEnded() noexcept = 0;

protected:
  EventsEndListener() = default;
  EventsEndListener(const EventsEndListener &) = default;
  EventsEndListener &operator=(const EventsEndListener &) = default;
  ~EventsEndListener() = default;
};

/// The events of one operation. Without an observer, nothing is computed and no memory is used. What the observer
/// throws is logged, and so is a lack of memory for an event; neither changes the operation.
///
/// One thread at a time uses the events of an operation, with one exception: `End` may be called on another thread while a
/// step of the operation runs. Events after the end are dropped.
class OperationEvents final : public FaultListener {
public:
  /// The events of an operation that is not observed.
  OperationEvents() noexcept : m_observer(nullptr), m_id(m_operation.id) {}

  /// Reports the start.
  /// @param observer null for none; it must outlive this object
  /// @param name of the operation
  /// @param id a UUID, which must outlive this object; if it is empty and there is an observer, a new one is made
  OperationEvents(OperationObserver *observer, const char *name, const std::string &id) noexcept;
  OperationEvents(const OperationEvents &) = delete;
  OperationEvents &operator=(const OperationEvents &) = delete;
  ~OperationEvents() = default;

  /// Runs `call` once, reports how it ended, and returns its result or throws its exception.
  template <typename Call>
  std::invoke_result_t<const Call &> Run(const Call &call);

  /// Reports the end once and forgets the secrets. Called once, for an operation that does not use `Run`.
  /// @param failure null if the operation succeeded
  /// @return false if another thread reports an event at this moment. That thread then reports the end, and calls
  ///         `listener`.
  bool End(std::exception_ptr failure, EventsEndListener &listener) noexcept;

  /// The identifier of the operation; empty if none was passed and there is no observer.
  const std::string &GetId() const noexcept { return m_observer ? m_operation.id : m_id; }

  /// From now on, no event contains the secret.
  void Hide(const std::string &password) noexcept;
  void HideToken(const SamlToken &token) noexcept;
  void HideToken(const std::string &tokenXml) noexcept;
  void HideLeg(const std::vector<std::uint8_t> &leg) noexcept;

  /// From now on, the messages belong to this leg of a negotiation. The number of the first leg is 1.
  void SetLeg(int leg) noexcept { m_leg = leg; }

  /// Sends `request`, and reports it and the response. With an observer, `request.facts` is set.
  Tarvel::Ref<Tarvel::Reader> Send(TransportSession &session, Request &request);

  /// Reports that `request` is about to be sent. With an observer, sets `request.facts` if it is null. For requests
  /// that no thread waits for.
  void BeginExchange(Request &request) noexcept;

  /// Reports the response, or why there is none.
  /// @param facts `facts` of the request; null if there was no memory for them
  void EndExchange(const ResponseFacts *facts, const char *failure) noexcept;

  /// Calls `read` with a handler that does the same as `handler` and also reports faults.
  template <typename Read>
  void Receive(const ResponseHandler &handler, const Read &read);

  void OnFault(const Tarvel::Xml::ElementNode &fault) noexcept override;

private:
  using Clock = std::chrono::steady_clock;

  /// What the object is used for at the moment.
  enum class Use : unsigned char {
    NONE,
    EVENT,            ///< an event is reported
    EVENT_BEFORE_END, ///< an event is reported, and `End` has been called
    ENDED
  };

  /// Does `call` unless the operation has ended; logs what it throws.
  template <typename Call>
  void Report(const char *subject, const Call &call) noexcept;
  template <typename Call>
  void Guard(const char *subject, const Call &call) noexcept;
  bool BeginUse() noexcept;
  void EndUse() noexcept;
  void ReportEnd() noexcept;
  std::shared_ptr<const ResponseHandler> ListeningTo(const ResponseHandler &handler) noexcept;
  void ReportSuccess() noexcept;
  void ReportFailure(const std::type_info *exceptionClass, const char *message) noexcept;

  OperationObserver *m_observer; // null if there is none, or if there was no memory to report the start
  const std::string &m_id;
  OperationInfo m_operation;
  Clock::time_point m_start;
  Clock::time_point m_sent;
  int m_leg = 0;
  SecretMask m_mask;
  std::atomic<Use> m_use{Use::NONE};
  std::exception_ptr m_failure; // the failure that ended the operation
  EventsEndListener *m_endListener = nullptr;
};

template <typename Call>
std::invoke_result_t<const Call &> OperationEvents::Run(const Call &call) {
  try {
    auto result = call();
    ReportSuccess();
    return result;
  } catch (const std::exception &failure) {
    ReportFailure(&typeid(failure), failure.what());
    throw;
  } catch (...) {
    ReportFailure(CurrentExceptionClass(), "");
    throw;
  }
}

template <typename Read>
void OperationEvents::Receive(const ResponseHandler &handler, const Read &read) {
  const std::shared_ptr<const ResponseHandler> listening = ListeningTo(handler);
  read(listening ? *listening : handler);
}

} // namespace SsoClient
