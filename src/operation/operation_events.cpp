// SPDX-License-Identifier: Apache-2.0

#include "operation/operation_events.h"

#include "exchange/soap_fault.h"

#include <tarvel/core/string_util.h>

#include <utility>

namespace SsoClient {

namespace {

std::int64_t MicrosecondsSince(std::chrono::steady_clock::time_point begin) {
  return std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::steady_clock::now() - begin).count();
}

} // namespace

OperationEvents::OperationEvents(OperationObserver *observer, const char *name, const std::string &id) noexcept
    : m_observer(observer), m_id(id) {
  if (!m_observer) {
    return;
  }
  try {
    m_operation.id = id.empty() ? Tarvel::StringUtil::GenerateUuid() : id;
    m_operation.name = name;
  } catch (...) {
    LogCaughtException(id, "The start of the observation", m_mask);
    m_observer = nullptr;
    return;
  }
  m_start = Clock::now();
  Report("The observer's OnStarted", [&] { m_observer->OnStarted(m_operation); });
}

void OperationEvents::Hide(const std::string &password) noexcept {
  Report("The mask", [&] { m_mask.AddPassword(password); });
}

void OperationEvents::HideToken(const SamlToken &token) noexcept {
  Report("The mask", [&] { m_mask.AddToken(token); });
}

void OperationEvents::HideToken(const std::string &tokenXml) noexcept {
  Report("The mask", [&] { m_mask.AddToken(tokenXml); });
}

void OperationEvents::HideLeg(const std::vector<std::uint8_t> &leg) noexcept {
  Report("The mask", [&] { m_mask.AddLeg(leg); });
}

Tarvel::Ref<Tarvel::Reader> OperationEvents::Send(TransportSession &session, Request &request) {
  Tarvel::Ref<Tarvel::Reader> response;
  if (!m_observer) {
    session.SendRequest(request, response);
    return response;
  }
  BeginExchange(request);
  try {
    session.SendRequest(request, response);
  } catch (const std::exception &failure) {
    EndExchange(request.facts.get(), failure.what());
    throw;
  } catch (...) {
    EndExchange(request.facts.get(), "");
    throw;
  }
  EndExchange(request.facts.get(), "");
  return response;
}

void OperationEvents::OnFault(const Tarvel::Xml::ElementNode &fault) noexcept {
  Report("The observer's OnFault", [&] {
    const SoapFault read = ReadSoapFault(fault);
    FaultEvent event;
    event.codeNamespace = m_mask.Apply(read.codeNamespace);
    event.code = m_mask.Apply(read.code);
    // The code is divided after masking, because the colon may be a part of a secret.
    event.codeName = event.code.substr(event.code.find(':') + 1);
    m_mask.AddPrefixOf(read.code, event.code);
    event.text = m_mask.Apply(read.text);
    event.detail = m_mask.Apply(read.detail);
    m_observer->OnFault(m_operation, event);
  });
}

template <typename Call>
void OperationEvents::Report(const char *subject, const Call &call) noexcept {
  if (m_observer && BeginUse()) {
    Guard(subject, call);
    EndUse();
  }
}

template <typename Call>
void OperationEvents::Guard(const char *subject, const Call &call) noexcept {
  if (!m_observer) {
    return;
  }
  try {
    call();
  } catch (...) {
    LogCaughtException(m_operation.id, subject, m_mask);
  }
}

/// @return false after the end
bool OperationEvents::BeginUse() noexcept {
  Use expected = Use::NONE;
  return m_use.compare_exchange_strong(expected, Use::EVENT);
}

void OperationEvents::EndUse() noexcept {
  Use expected = Use::EVENT;
  if (!m_use.compare_exchange_strong(expected, Use::NONE)) {
    ReportEnd();
    m_endListener->OnEventsEnded();
  }
}

bool OperationEvents::End(std::exception_ptr failure, EventsEndListener &listener) noexcept {
  m_failure = std::move(failure);
  m_endListener = &listener;
  for (;;) {
    Use expected = Use::NONE;
    if (m_use.compare_exchange_strong(expected, Use::ENDED)) {
      ReportEnd();
      return true;
    }
    expected = Use::EVENT;
    if (m_use.compare_exchange_strong(expected, Use::EVENT_BEFORE_END)) {
      return false;
    }
  }
}

void OperationEvents::ReportEnd() noexcept {
  const std::exception_ptr failure = std::move(m_failure);
  if (m_observer) {
    try {
      if (failure) {
        std::rethrow_exception(failure);
      }
      ReportSuccess();
    } catch (const std::exception &exception) {
      ReportFailure(&typeid(exception), exception.what());
    } catch (...) {
      ReportFailure(CurrentExceptionClass(), "");
    }
  }
  m_mask = SecretMask();
}

std::shared_ptr<const ResponseHandler> OperationEvents::ListeningTo(const ResponseHandler &handler) noexcept {
  std::shared_ptr<const ResponseHandler> listening;
  Report("The observer's OnFault", [&] { listening = handler.WithFaultListener(*this); });
  return listening;
}

void OperationEvents::BeginExchange(Request &request) noexcept {
  Report("The mask", [&] { m_mask.AddRequest(request.body); });
  Report("The place for the facts of a response", [&] {
    if (!request.facts) {
      request.facts = std::make_shared<ResponseFacts>();
    }
  });
  Report("The observer's OnRequestSent", [&] {
    m_observer->OnRequestSent(m_operation, {request.soapAction, request.body.size(), m_leg});
  });
  if (m_observer) {
    m_sent = Clock::now();
  }
}

void OperationEvents::EndExchange(const ResponseFacts *facts, const char *failure) noexcept {
  if (!facts) {
    return; // there was no memory for the facts, so nothing is known about the response
  }
  Report("The observer's OnResponseReceived", [&] {
    ResponseReceivedEvent event;
    event.durationMicroseconds = MicrosecondsSince(m_sent);
    event.leg = m_leg;
    if (facts->status != 0) {
      event.status = facts->status;
      event.reason = m_mask.Apply(facts->reason);
      event.contentType = m_mask.Apply(facts->contentType);
      event.responseOctets = facts->octets;
    } else {
      event.reason = m_mask.Apply(failure);
    }
    m_observer->OnResponseReceived(m_operation, event);
  });
}

void OperationEvents::ReportSuccess() noexcept {
  Guard("The observer's OnEnded", [&] {
    OperationEndedEvent event;
    event.durationMicroseconds = MicrosecondsSince(m_start);
    m_observer->OnEnded(m_operation, event);
  });
}

void OperationEvents::ReportFailure(const std::type_info *exceptionClass, const char *message) noexcept {
  if (!m_observer) {
    return;
  }
  OperationEndedEvent event;
  event.outcome = OperationEndedEvent::Outcome::FAILED;
  event.durationMicroseconds = MicrosecondsSince(m_start);
  try {
    event.exceptionClass = ClassNameOf(exceptionClass);
    event.message = m_mask.Apply(message);
  } catch (...) {
    // Without memory, the end is reported without its texts.
    LogCaughtException(m_operation.id, "The description of the failure", m_mask);
  }
  Guard("The observer's OnEnded", [&] { m_observer->OnEnded(m_operation, event); });
}

} // namespace SsoClient
