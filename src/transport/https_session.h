// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HttpsSession`, one conversation over HTTP, and what becomes of an HTTP response.

#pragma once

#include "transport/transport.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/http/user_agent.h>
#include <tarvel/system/scheduled_item.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient {

/// Posts requests with a cookie store of its own: what the service sets in one leg of a negotiation comes back in the
/// next, and in no other session.
class HttpsSession final : public TransportSession {
public:
  HttpsSession(const Tarvel::Ref<Tarvel::Http::ConnectionSpec> &spec, const std::string &path,
               std::int64_t timeoutMicroseconds);

  void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) override;

  /// `completion` runs on an I/O thread, so it must not block. Nothing limits the time: cancel `item` for that.
  void SendRequestAsync(const Request &request, const Completion &completion,
                        Tarvel::Ref<Tarvel::System::ScheduledItem> &item) override;

  /// The same; the other form hands the pending request out as its item.
  void SendRequestAsync(const Request &request, const Completion &completion,
                        Tarvel::Ref<Tarvel::Http::PendingRequestItem> &pending);

private:
  Tarvel::Ref<Tarvel::Http::UserAgent> m_userAgent;
  const std::string m_path;
  const std::int64_t m_timeoutMicroseconds;
};

/// Turns the outcome of an HTTP exchange into either an error or a body. 2xx and 500 have a body, the latter because SOAP
/// 1.1 sends its faults so; any other status is an error.
/// @param exception null when there is a response. @param error a `CommunicationException`; left alone when there is a
/// body. @param body left alone when there is an error.
void TranslateResponse(const Tarvel::Exception *exception, const Tarvel::Ref<Tarvel::Http::ClientResponse> &response,
                       std::shared_ptr<const Tarvel::Exception> &error, Tarvel::Ref<Tarvel::Reader> &body);

/// The completion function of an asynchronous request: calls back once, with the error or with the body, the other null.
/// When memory runs out on the way, the error is a `Tarvel::OutOfMemoryException`.
void AsyncTranslateResponse(const TransportSession::Completion &completion, const Tarvel::Exception *exception,
                            const Tarvel::Ref<Tarvel::Http::ClientResponse> &response,
                            const Tarvel::Ref<Tarvel::Http::PendingRequestItem> &pending);

/// The completion of a request whose outcome is waited for.
void noop(const Tarvel::Exception *exception, Tarvel::Reader *response);

} // namespace SsoClient
