// SPDX-License-Identifier: Apache-2.0
// The steps of an operation.
#include "client/client_operation.h"
#include "client/retry.h"
#include "operation/required_object.h"

#include <ssoclient/exceptions.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <mutex>
#include <random>
#include <utility>

namespace SsoClient {

namespace {

using std::chrono::milliseconds;
using Tarvel::ForkSafeMutex;

/// A thread that waits for the operation does not read a longer response, because reading it takes long.
constexpr std::size_t LONG_RESPONSE_BYTES = 1024 * 1024;

std::exception_ptr ToPointer(const Tarvel::Exception &failure) noexcept {
  std::exception_ptr pointer;
  try {
    failure.Throw();
  } catch (...) {
    pointer = std::current_exception();
  }
  return pointer;
}

/// The text of an exception, and whether the transport failed.
struct TransportFailure {
  explicit TransportFailure(const std::exception_ptr &failure) {
    if (!failure) {
      return;
    }
    try {
      std::rethrow_exception(failure);
    } catch (const CommunicationException &exception) {
      text = exception.what();
      isCommunication = true;
    } catch (const std::exception &exception) {
      text = exception.what();
    } catch (...) { // NOLINT(bugprone-empty-catch): there is no text
    }
  }

  std::string text;
  bool isCommunication = false;
};

/// From 0 to 1; different in programs that start at the same time. Never throws, unlike `std::random_device`.
double GetRandom(const void *object) {
  const auto now = static_cast<std::uint64_t>(std::chrono::steady_clock::now().time_since_epoch().count());
  std::minstd_rand generator(static_cast<std::uint32_t>(now ^ reinterpret_cast<std::uintptr_t>(object)));
  generator.discard(1); // the first number of similar seeds is similar
  return std::uniform_real_distribution<double>()(generator);
}

} // namespace

boost::optional<OperationEnding> ClientOperation::Compose() {
  Request request;
  ComposeRequest(*m_secrets.task, *m_steps, request, m_events);
  ForgetTask();
  Send(std::move(request));
  return boost::none;
}

/// The task is not needed after the request of the last attempt has been composed.
void ClientOperation::ForgetTask() noexcept {
  if (m_attempt >= m_retryPolicy.attempts) {
    m_secrets.task = nullptr;
  }
}

boost::optional<OperationEnding> ClientOperation::AskHandler() {
  if (!m_secrets.handler) {
    const auto &acquisition = std::get<Acquisition>(*m_secrets.task);
    const auto &credential = std::get<NegotiationCredential>(acquisition.credential);
    TokenSteps::LogNegotiation(acquisition.spec);
    CheckRequired(static_cast<bool>(credential.makeHandler));
    m_secrets.handler = credential.makeHandler();
    if (IsDecided()) {
      return boost::none;
    }
  }
  NegotiationHandler &handler = Required(m_secrets.handler);
  SPNegoResponse &spnego = m_secrets.spnego;
  if (!spnego.tokenXml.empty()) {
    TokenSteps::HandOverFinalLeg(handler, spnego.leg);
    Schedule(&ClientOperation::VerifyNegotiated,
             spnego.tokenXml.size() > LONG_RESPONSE_BYTES ? Place::LONG : Place::COMPUTING);
    return boost::none;
  }
  const auto leg = TokenSteps::AskForLeg(handler, spnego.leg, ++m_leg, m_events);
  if (IsDecided()) {
    return boost::none;
  }
  Request request;
  if (spnego.contextId.empty()) {
    m_steps->GetRequestBuilder().BuildInitialSPNegoRequest(std::get<Acquisition>(*m_secrets.task).spec, *leg, request);
    ForgetTask();
  } else {
    m_steps->GetRequestBuilder().BuildContinuedSPNegoRequest(spnego.contextId, *leg, request);
  }
  Send(std::move(request));
  return boost::none;
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): the request is wiped when this returns.
void ClientOperation::Send(Request request) {
  m_facts = request.facts = std::make_shared<ResponseFacts>();
  if (!m_session) {
    m_session = m_core->GetTransport().CreateSession();
  }
  const std::shared_ptr<TransportSession> session = m_session;
  m_events.BeginExchange(request);
  unsigned exchange = 0;
  Clock::time_point end;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isDecided || IsOfParent()) {
      return;
    }
    exchange = ++m_exchange;
    m_messageEnd = end = m_core->GetTime().GetSteadyTime() + session->GetTimeout();
    m_held.session = session;
    m_isLate = false;
    if (m_waiter) {
      m_waiter->changed.notify_one(); // that thread must use the new limit
    }
  }
  Item item;
  try {
    StartMessageLimit(exchange, end);
    session->SendRequestAsync(
        request,
        [self = shared_from_this()](const Tarvel::Exception *failure, Tarvel::Reader *response) {
          self->OnResponse(failure, response);
        },
        item);
  } catch (...) {
    m_events.EndExchange(m_facts.get(), TransportFailure(std::current_exception()).text.c_str());
    throw;
  }
  KeepRequest(exchange, item);
}

void ClientOperation::StartMessageLimit(unsigned exchange, Clock::time_point end) {
  if (m_waiter || (m_deadline && *m_deadline <= end)) {
    return;
  }
  Keep(&Held::messageLimit, m_core->GetTime().StartTimer(end, [weak = weak_from_this(), exchange] {
    if (const auto self = weak.lock()) {
      self->OnMessageLimit(exchange);
    }
  }));
}

void ClientOperation::OnMessageLimit(unsigned exchange) noexcept {
  std::shared_ptr<TransportSession> session;
  Item request;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isDecided || exchange != m_exchange || m_isLate) {
      return;
    }
    m_isLate = true;
    m_messageEnd = Clock::time_point::max();
    session = m_held.session;
    request = m_held.request;
  }
  if (session && request) {
    session->TimeOut(*request);
  }
}

/// Keeps `item`, which cancels the request. If the request's outcome has arrived, there is nothing to keep.
void ClientOperation::KeepRequest(unsigned exchange, const Item &item) noexcept {
  std::shared_ptr<TransportSession> session;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (!m_isDecided) {
      if (exchange != m_exchange) {
        return;
      }
      m_held.request = item;
      session = m_isLate ? m_held.session : nullptr;
      if (!session) {
        return;
      }
    }
  }
  if (session) {
    session->TimeOut(*item);
  } else if (item) {
    item->Cancel();
  }
}

/// Runs on an I/O thread.
void ClientOperation::OnResponse(const Tarvel::Exception *failure, Tarvel::Reader *response) noexcept {
  Item request; // what is swapped is released outside the lock
  Item limit;
  std::shared_ptr<TransportSession> session;
  if (!BeginStep()) {
    return;
  }
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    ++m_exchange;
    m_messageEnd = Clock::time_point::max();
    std::swap(request, m_held.request);
    std::swap(limit, m_held.messageLimit);
    session.swap(m_held.session);
  }
  if (limit) {
    limit->Cancel();
  }
  m_responseFailure = failure ? ToPointer(*failure) : nullptr;
  m_secrets.response = Tarvel::Ref<Tarvel::Reader>(response);
  std::exception_ptr unscheduled;
  try {
    Schedule(&ClientOperation::ReadResponse, m_facts->octets > LONG_RESPONSE_BYTES ? Place::LONG : Place::COMPUTING);
  } catch (...) {
    unscheduled = std::current_exception();
  }
  EndStep(false);
  if (unscheduled) {
    Cancel(unscheduled);
  }
}

boost::optional<OperationEnding> ClientOperation::ReadResponse() {
  const std::exception_ptr failure = std::exchange(m_responseFailure, nullptr);
  const TransportFailure transport(failure);
  m_events.EndExchange(m_facts.get(), transport.text.c_str());
  if (failure) {
    if (transport.isCommunication && RetryLater()) {
      return boost::none;
    }
    return OperationEnding{failure, nullptr, false};
  }
  return m_kind == TaskKind::NEGOTIATE ? ReadLeg() : ReadResult();
}

OperationEnding ClientOperation::ReadResult() {
  Tarvel::Reader &response = *m_secrets.response;
  if (m_kind == TaskKind::VALIDATE) {
    return {nullptr, nullptr, m_steps->ReadValidity(response, m_events)};
  }
  return EndWithToken(m_kind == TaskKind::RENEW ? m_steps->ReadRenewed(response, m_events)
                                                : m_steps->ReadIssued(response, m_events));
}

boost::optional<OperationEnding> ClientOperation::ReadLeg() {
  SPNegoResponse &spnego = m_secrets.spnego;
  m_steps->ReadLeg(*m_secrets.response, spnego, m_events);
  m_secrets.response.reset();
  TokenSteps::CheckLeg(spnego, m_events);
  if (!spnego.tokenXml.empty() && spnego.leg.empty()) {
    return VerifyNegotiated();
  }
  Schedule(&ClientOperation::AskHandler, Place::BLOCKING);
  return boost::none;
}

boost::optional<OperationEnding> ClientOperation::VerifyNegotiated() {
  return EndWithToken(m_steps->ToSamlToken(m_secrets.spnego.tokenXml, m_events));
}

OperationEnding ClientOperation::EndWithToken(std::shared_ptr<const SamlToken> token) {
  if (!token) {
    throw SsoException("The service returned an empty text instead of a token");
  }
  return {nullptr, std::move(token), false};
}

/// Repeats the whole attempt later if the service cannot have acted upon it. When a later leg of a negotiation fails,
/// the service has acted upon the first one.
bool ClientOperation::RetryLater() {
  if (m_attempt >= m_retryPolicy.attempts || m_leg > 1) {
    return false;
  }
  const TimeSource &time = m_core->GetTime();
  const boost::optional<milliseconds> delay =
      GetRetryDelay(m_retryPolicy, m_attempt, *m_facts, time.GetSystemTime(), GetRandom(this));
  if (!delay) {
    return false;
  }
  const Clock::time_point next = time.GetSteadyTime() + *delay;
  if (m_deadline && next >= *m_deadline) {
    return false;
  }
  ++m_attempt;
  m_leg = 0;
  m_session = nullptr;
  m_secrets.handler = nullptr;
  Keep(&Held::retry, time.StartTimer(next, [weak = weak_from_this()] {
    if (const auto self = weak.lock()) {
      self->StartAgain();
    }
  }));
  return true;
}

void ClientOperation::StartAgain() noexcept {
  try {
    ScheduleFirst();
  } catch (...) {
    Cancel(std::current_exception());
  }
}

} // namespace SsoClient
