// SPDX-License-Identifier: Apache-2.0

#include "transport/https_session.h"

#include <ssoclient/exceptions.h>
#include <tarvel/http/cookie_store.h>

#include <new>

namespace SsoClient {

namespace {

using Tarvel::Exception;
using Tarvel::Reader;
using Tarvel::Ref;
using Tarvel::Http::ClientRequest;
using Tarvel::Http::ClientResponse;
using Tarvel::Http::PendingRequestItem;
using Tarvel::System::ScheduledItem;

constexpr int INTERNAL_SERVER_ERROR = 500;

bool HasBody(int status) {
  return status == INTERNAL_SERVER_ERROR || status / 100 == 2;
}

} // namespace

HttpsSession::HttpsSession(const Ref<Tarvel::Http::ConnectionSpec> &spec, const std::string &path,
                           std::int64_t timeoutMicroseconds)
    : m_path(path), m_timeoutMicroseconds(timeoutMicroseconds) {
  Ref<Tarvel::Http::CookieStore> cookies;
  Tarvel::Http::CreateCookieStore("", cookies);
  Tarvel::Http::CreateHttpUserAgent(spec, cookies, nullptr, m_userAgent);
}

void HttpsSession::SendRequest(const Request &request, Ref<Reader> &response) {
  Ref<PendingRequestItem> pending;
  // The facts are read on this thread, because the I/O thread must not write them after a time-out.
  Start(request, noop, nullptr, pending);
  std::shared_ptr<const Exception> error;
  Ref<Reader> body;
  try {
    Ref<ClientResponse> received;
    m_userAgent->WaitForRequest(pending, m_timeoutMicroseconds, received);
    ReadFacts(pending, received, request.facts.get());
    TranslateResponse(nullptr, received, error, body);
  } catch (const Exception &exception) {
    ReadFacts(pending, nullptr, request.facts.get());
    TranslateResponse(&exception, nullptr, error, body);
  }
  if (error) {
    error->Throw();
  }
  response = body;
}

void HttpsSession::SendRequestAsync(const Request &request, const Completion &completion, Ref<ScheduledItem> &item) {
  Ref<PendingRequestItem> pending;
  SendRequestAsync(request, completion, pending);
  item = pending;
}

void HttpsSession::SendRequestAsync(const Request &request, const Completion &completion,
                                    Ref<PendingRequestItem> &pending) {
  Start(request, completion, request.facts, pending);
}

void HttpsSession::Start(const Request &request, const Completion &completion,
                         const std::shared_ptr<ResponseFacts> &facts, Ref<PendingRequestItem> &pending) {
  Ref<ClientRequest> message;
  Tarvel::Http::CreateHttpRequest("POST", m_path, message);
  message->SetHeader("Content-Type", request.declaresCharset ? "text/xml; charset=utf-8" : "text/xml");
  message->SetHeader("SOAPAction", '"' + request.soapAction + '"');
  message->WriteBody(request.body);
  m_userAgent->StartRequest(
      message,
      [completion, facts](const Exception *exception, const Ref<ClientResponse> &response,
                          const Ref<PendingRequestItem> &item) {
        ReadFacts(item, response, facts.get());
        AsyncTranslateResponse(completion, exception, response, item);
      },
      pending);
}

void HttpsSession::TimeOut(ScheduledItem &item) noexcept {
  if (auto *const pending = dynamic_cast<PendingRequestItem *>(&item)) {
    pending->TimeOut(m_timeoutMicroseconds);
  }
}

void TranslateResponse(const Exception *exception, const Ref<ClientResponse> &response,
                       std::shared_ptr<const Exception> &error, Ref<Reader> &body) {
  if (exception) {
    error = std::make_shared<CommunicationException>(exception->what());
    return;
  }
  const int status = response->GetStatusCode();
  if (HasBody(status)) {
    body = response;
    return;
  }
  error = std::make_shared<CommunicationException>("Server returned error: " + std::to_string(status) + " " +
                                                   response->GetReasonPhrase());
}

void ReadFacts(const Ref<PendingRequestItem> &pending, const Ref<ClientResponse> &response,
               ResponseFacts *facts) noexcept {
  if (!facts) {
    return;
  }
  facts->hasConnected = pending->HasConnected();
  if (!response) {
    return;
  }
  facts->status = response->GetStatusCode();
  facts->octets = response->GetBodyLength();
  try {
    facts->reason = response->GetReasonPhrase();
    response->GetHeader("Content-Type", facts->contentType);
    response->GetHeader("Retry-After", facts->retryAfter);
  } catch (const std::bad_alloc &) {
    // Without memory the texts are missing, but the response is not lost. NOLINT(bugprone-empty-catch)
  }
}

void AsyncTranslateResponse(const TransportSession::Completion &completion, const Exception *exception,
                            const Ref<ClientResponse> &response, const Ref<PendingRequestItem> &) {
  std::shared_ptr<const Exception> error;
  Ref<Reader> body;
  try {
    TranslateResponse(exception, response, error, body);
  } catch (const std::bad_alloc &) {
    const Tarvel::OutOfMemoryException noMemory;
    completion(&noMemory, nullptr);
    return;
  }
  completion(error.get(), body.get());
}

void noop(const Exception *, Reader *) {}

} // namespace SsoClient
