// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HttpsSession`, one conversation over HTTP, and the translation of HTTP responses.

#pragma once

#include "transport/transport.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/http/user_agent.h>
#include <tarvel/system/scheduled_item.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient {

/// Posts requests with its own cookie store: a cookie that the service sets in one leg of a negotiation is sent in the
/// next leg, and in no other session.
class HttpsSession final : public TransportSession {
public:
  HttpsSession(const Tarvel::Ref<Tarvel::Http::ConnectionSpec> &spec, const std::string &path,
               std::int64_t timeoutMicroseconds);

  void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) override;

  /// `completion` runs on an I/O thread, so it must not block. There is no time-out: cancel `item` to stop the request.
  void SendRequestAsync(const Request &request, const Completion &completion,
                        Tarvel::Ref<Tarvel::System::ScheduledItem> &item) override;

  /// The same, but sets `pending` to the request itself, which can be waited for.
  void SendRequestAsync(const Request &request, const Completion &completion,
                        Tarvel::Ref<Tarvel::Http::PendingRequestItem> &pending);

  std::chrono::microseconds GetTimeout() const noexcept override {
    return std::chrono::microseconds(m_timeoutMicroseconds);
  }
  void TimeOut(Tarvel::System::ScheduledItem &item) noexcept override;

private:
  /// Posts the request. `facts` is written on the I/O thread, before the completion; null for none.
  void Start(const Request &request, const Completion &completion, const std::shared_ptr<ResponseFacts> &facts,
             Tarvel::Ref<Tarvel::Http::PendingRequestItem> &pending);

  Tarvel::Ref<Tarvel::Http::UserAgent> m_userAgent;
  const std::string m_path;
  const std::int64_t m_timeoutMicroseconds;
};

/// Sets either `error` or `body` from the outcome of an HTTP exchange, and leaves the other unchanged. With
/// status 2xx or 500 it sets `body`, because SOAP 1.1 sends faults with 500. Any other status is an error.
/// @param exception the failure of the exchange; null when there is a response
/// @param error set to a `CommunicationException`
void TranslateResponse(const Tarvel::Exception *exception, const Tarvel::Ref<Tarvel::Http::ClientResponse> &response,
                       std::shared_ptr<const Tarvel::Exception> &error, Tarvel::Ref<Tarvel::Reader> &body);

/// Sets `facts`, unless it is null, from `pending` and its response. `response` is null if there is none.
void ReadFacts(const Tarvel::Ref<Tarvel::Http::PendingRequestItem> &pending,
               const Tarvel::Ref<Tarvel::Http::ClientResponse> &response, ResponseFacts *facts) noexcept;

/// Calls `completion` once, with the error and null or with null and the body of the response. The error is a
/// `Tarvel::OutOfMemoryException` when memory runs out here. `pending` is not used; the user agent passes it.
void AsyncTranslateResponse(const TransportSession::Completion &completion, const Tarvel::Exception *exception,
                            const Tarvel::Ref<Tarvel::Http::ClientResponse> &response,
                            const Tarvel::Ref<Tarvel::Http::PendingRequestItem> &pending);

/// Does nothing: the completion of a request that is waited for.
void noop(const Tarvel::Exception *exception, Tarvel::Reader *response);

} // namespace SsoClient
