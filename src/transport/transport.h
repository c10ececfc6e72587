// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Transport` and `TransportSession`, the service's view of what carries its requests.

#pragma once

#include "exchange/request.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <functional>
#include <memory>

namespace Tarvel::System {
class ScheduledItem;
} // namespace Tarvel::System

namespace SsoClient {

/// One conversation with the service: the legs of a negotiation share one, any other request has its own. For one
/// operation at a time.
class TransportSession {
public:
  /// Called once: with null and a reader over the response body, or with the failure and null. Both pointers are good
  /// during the call.
  using Completion = std::function<void(const Tarvel::Exception *failure, Tarvel::Reader *response)>;

  /// Posts the request and waits for the whole response. `response` stays readable after the session is gone.
  /// @throws CommunicationException when the transport fails.
  virtual void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) = 0;

  /// Posts the request without waiting; `item` is the work that is under way. `completion` runs on an I/O
  /// thread, where it must not block, nor wait for another request.
  virtual void SendRequestAsync(const Request &request, const Completion &completion,
                                Tarvel::Ref<Tarvel::System::ScheduledItem> &item) = 0;

protected:
  TransportSession() = default;
  TransportSession(const TransportSession &) = default;
  TransportSession &operator=(const TransportSession &) = default;
  ~TransportSession() = default;
};

/// Opens conversations with one service. Safe on any thread.
class Transport {
public:
  /// A new session, which the caller shares with nobody.
  virtual std::shared_ptr<TransportSession> CreateSession() const = 0;

protected:
  Transport() = default;
  Transport(const Transport &) = default;
  Transport &operator=(const Transport &) = default;
  ~Transport() = default;
};

} // namespace SsoClient
