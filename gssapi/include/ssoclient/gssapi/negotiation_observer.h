// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NegotiationObserver`, through which a program follows the legs that a `SpnegoHandler` makes.

#pragma once

#include <ssoclient/gssapi/export.h>

#include <cstddef>
#include <cstdint>
#include <exception>
#include <string>

namespace SsoClient::Gssapi {

/// The handler has processed a leg of the service, and has made the client's next leg. The event contains no part of a
/// leg or a ticket.
struct NegotiationLegEvent {
  int leg = 0;                           ///< the number of the client's leg, from 1
  std::size_t serviceOctets = 0;         ///< of the service's leg; 0 if there was none
  std::size_t clientOctets = 0;          ///< of the client's leg; 0 if there is nothing to send
  std::string mechanism;                 ///< the mechanism, such as "Kerberos 5"; empty as long as none has been chosen
  bool isComplete = false;               ///< whether the client's side of the negotiation is complete
  bool isMutuallyAuthenticated = false;  ///< whether the service has proved its identity
  std::int64_t durationMicroseconds = 0; ///< the time that the handler needed, including the waits for the realm
};

/// The caller implements it. Its functions are called on the thread that calls `SpnegoHandler::NegotiateLeg`, within
/// that call. What they throw is written to the log (logger "SsoClient") and changes nothing else. An observer that
/// several handlers share must be safe on all their threads.
class SSOCLIENT_GSSAPI_API NegotiationObserver {
public:
  /// A leg has been made.
  virtual void OnLeg(const NegotiationLegEvent &event);

  /// `NegotiateLeg` throws `failure`, which is valid during the call. If the GSSAPI has failed, the message ends with
  /// the texts of the major and the minor status (see exceptions.h).
  /// @param leg the number of the leg that could not be made, from 1
  virtual void OnFailed(int leg, const std::exception &failure);

protected:
  NegotiationObserver() = default;
  NegotiationObserver(const NegotiationObserver &) = default;
  NegotiationObserver &operator=(const NegotiationObserver &) = default;
  ~NegotiationObserver() = default;
};

} // namespace SsoClient::Gssapi
