// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Transport` and `TransportSession`, which send requests to the service.
///
/// They are interfaces so that tests can replace the network. The product has one implementation of each.

#pragma once

#include "exchange/request.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/system/scheduled_item.h>

#include <chrono>
#include <functional>
#include <memory>

namespace SsoClient {

/// One conversation with the service. All legs of a negotiation are sent in one session; every other request has its
/// own. A session is for one operation at a time.
class TransportSession {
public:
  /// Called once: with null and a reader over the response body, or with the failure and null. Both pointers are valid
  /// during the call only.
  using Completion = std::function<void(const Tarvel::Exception *failure, Tarvel::Reader *response)>;

  /// Posts the request and waits for the whole response. `response` can still be read after the session is destroyed.
  /// If `request.facts` is not null, the facts of the response are written there, also when an HTTP status is thrown as
  /// an exception.
  /// @throws CommunicationException when the transport fails.
  virtual void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) = 0;

  /// Posts the request without waiting; `item` cancels it. `completion` runs on an I/O thread, where it must neither
  /// block nor wait for another request. The facts of the response are written on the same thread, before `completion`.
  virtual void SendRequestAsync(const Request &request, const Completion &completion,
                                Tarvel::Ref<Tarvel::System::ScheduledItem> &item) = 0;

  /// The time that each request may take. `SendRequest` ends after it; callers of `SendRequestAsync` call `TimeOut`
  /// after it.
  virtual std::chrono::microseconds GetTimeout() const noexcept { return std::chrono::minutes(4); }

  /// Cancels a request of this session. Its completion receives the failure that `SendRequest` throws after the
  /// time-out.
  /// @param item what `SendRequestAsync` has returned
  virtual void TimeOut(Tarvel::System::ScheduledItem &item) noexcept { item.Cancel(); }

protected:
  TransportSession() = default;
  TransportSession(const TransportSession &) = default;
  TransportSession &operator=(const TransportSession &) = default;
  ~TransportSession() = default;
};

/// Opens conversations with one service. Safe on any thread.
class Transport {
public:
  /// A new session. The caller has the only reference to it.
  virtual std::shared_ptr<TransportSession> CreateSession() const = 0;

protected:
  Transport() = default;
  Transport(const Transport &) = default;
  Transport &operator=(const Transport &) = default;
  ~Transport() = default;
};

} // namespace SsoClient
