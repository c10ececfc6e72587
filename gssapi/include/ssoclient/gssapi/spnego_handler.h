// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SpnegoHandler`, a negotiation handler over the system's GSSAPI: the client's part of SPNEGO with a Kerberos ticket.

#pragma once

#include <ssoclient/gssapi/export.h>
#include <ssoclient/gssapi/negotiation_observer.h>
#include <ssoclient/negotiation_handler.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient::Gssapi {

/// The two sides of a negotiation, the client's credentials, and the limits. No text may contain a null character.
struct SpnegoSettings {
  /// The service: host-based, such as "HTTP@sts.corp.example"; or, when it contains a "/", a Kerberos principal such as
  /// "HTTP/sts.corp.example@CORP.EXAMPLE". Required.
  std::string service;
  /// The principal to negotiate as, such as "alice@CORP.EXAMPLE"; empty for the first of the cache or the keytab.
  std::string client;
  /// The credential cache, such as "FILE:/run/user/1000/tickets"; empty for the default one. If the environment
  /// variable KRB5CCNAME is set, its value is the default one.
  std::string credentialCache;
  /// A keytab that is used to get a ticket, such as "FILE:/etc/example/client.keytab"; empty for none. The ticket is
  /// kept in `credentialCache`, and replaced there when it has expired. If `credentialCache` is empty, the ticket is
  /// kept in memory until the handler is destroyed, and the default cache is neither read nor written.
  std::string clientKeytab;
  /// Asks for the three-leg form of Kerberos (DCE style), in which the client confirms the service's answer with a
  /// further leg. Only for services that expect it.
  bool dceStyle = false;
  /// The maximum number of the client's legs, including the answer to the final leg. Kerberos needs two, or three in
  /// DCE style.
  int maximumLegs = 10;
  /// The maximum time in seconds from the start of the first leg to the end of the last one, including the time that
  /// the service takes. It is checked before and after each leg; nothing is interrupted.
  std::int64_t timeLimitSec = 60;
  /// Follows the legs; null for none. Shared until the handler is destroyed.
  std::shared_ptr<NegotiationObserver> observer;
};

/// The client's side of one negotiation; another negotiation needs another handler. Mutual authentication is requested,
/// and credentials are never delegated. A handler may be used on any thread, but only on one at a time. It is owned by
/// the shared pointer that `CreateSpnegoHandler` returns, and frees its GSSAPI objects when it is destroyed.
///
/// `NegotiateLeg` makes the first leg when it is called with an empty leg of the service. That call asks the realm for
/// tickets, and takes as long as the Kerberos library waits for an answer. It throws
/// - `GssCredentialException`, `GssNegotiationException` and `GssLimitException` (see their comments),
/// - `Tarvel::InvalidArgumentException` when the service's leg is not empty in the first call,
/// - `Tarvel::InvalidStateException` when an earlier call has failed.
///
/// It returns an empty leg when there is nothing to send: after the final leg, and when the service waits for the
/// client although the negotiation is complete.
class SSOCLIENT_GSSAPI_API SpnegoHandler : public NegotiationHandler {
public:
  /// Whether the negotiation is complete and the service has proved its identity. A service may issue a token and leave
  /// out the final leg, which contains this proof. The token is still valid if it is signed with a trusted certificate.
  /// Call this after the operation has returned if you need proof of the service's identity.
  virtual bool IsMutuallyAuthenticated() const noexcept = 0;

  /// @throws GssNegotiationException unless `IsMutuallyAuthenticated` returns true.
  virtual void RequireMutualAuthentication() const = 0;

protected:
  SpnegoHandler() = default;
  SpnegoHandler(const SpnegoHandler &) = default;
  SpnegoHandler &operator=(const SpnegoHandler &) = default;
  ~SpnegoHandler() = default;
};

/// Creates a handler for one negotiation. It looks for credentials at the first leg, not here. The process's
/// environment is never changed.
/// @throws Tarvel::InvalidArgumentException for a service name that is empty or lacks a part, for a text that contains
///         a null character, and for a limit that is not positive.
SSOCLIENT_GSSAPI_API std::shared_ptr<SpnegoHandler> CreateSpnegoHandler(const SpnegoSettings &settings);

} // namespace SsoClient::Gssapi
