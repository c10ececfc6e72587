// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SpnegoHandler`, a negotiation handler over the system's GSSAPI: the client's part of SPNEGO with a Kerberos ticket.

#pragma once

#include <ssoclient/gssapi/export.h>
#include <ssoclient/negotiation_handler.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient::Gssapi {

/// Who negotiates with whom, by what credentials, and for how long at most. All texts are without null characters.
struct SpnegoSettings {
  /// The service: host-based as "HTTP@sts.corp.example", or, when there is a "/" in it, a Kerberos principal as
  /// "HTTP/sts.corp.example@CORP.EXAMPLE". Required.
  std::string service;
  /// The principal to negotiate as, as "alice@CORP.EXAMPLE"; empty for the one that the cache or the keytab has first.
  std::string client;
  /// The credential cache, as "FILE:/run/user/1000/tickets"; empty for the default one, which the environment variable
  /// KRB5CCNAME may name to the Kerberos library.
  std::string credentialCache;
  /// A keytab to get a ticket with, as "FILE:/etc/example/client.keytab"; empty for none. The ticket is kept in
  /// `credentialCache`, and renewed there when it has expired. Without one it stays in memory and goes with the handler:
  /// the default cache is neither read nor written.
  std::string clientKeytab;
  /// Asks for the three-leg form of Kerberos (DCE style), in which the client confirms the service's answer by a leg of its
  /// own. Only for services that expect it.
  bool dceStyle = false;
  /// How many legs the client makes at most, the answer to the final leg included. Kerberos makes two, three in DCE style.
  int maximumLegs = 10;
  /// Seconds from the first leg's beginning to the last one's end at most, which includes the waiting for the service. It
  /// is looked at before and after each leg: what is under way is not interrupted.
  std::int64_t timeLimitSec = 60;
};

/// The client's part in one negotiation; a second one needs a handler of its own. Mutual authentication is demanded, and
/// credentials are never delegated. For one thread at a time, any thread. Held by the shared pointer that
/// `CreateSpnegoHandler` made; what it holds of the GSSAPI goes with it.
///
/// `NegotiateLeg` makes the first leg when it is called with none of the service's; it asks the realm for tickets then,
/// which takes as long as the Kerberos library waits for an answer. It raises
/// - `GssCredentialException`, `GssNegotiationException` and `GssLimitException`, each when its comment says,
/// - `Tarvel::InvalidArgumentException` when the first call comes with a leg of the service,
/// - `Tarvel::InvalidStateException` once a call has failed.
/// Its answer is empty when there is nothing to send: after the final leg, and when the service waits for the client
/// although the negotiation is complete.
class SSOCLIENT_GSSAPI_API SpnegoHandler : public NegotiationHandler {
public:
  /// Whether the negotiation is complete and the service has proved who it is. A service that issues a token without a
  /// final leg may leave this out: a token that is signed by a trusted certificate is good all the same, but whoever must
  /// know whom he has spoken to asks here, once the operation has returned.
  virtual bool IsMutuallyAuthenticated() const noexcept = 0;

  /// @throws GssNegotiationException unless `IsMutuallyAuthenticated`.
  virtual void RequireMutualAuthentication() const = 0;

protected:
  SpnegoHandler() = default;
  SpnegoHandler(const SpnegoHandler &) = default;
  SpnegoHandler &operator=(const SpnegoHandler &) = default;
  ~SpnegoHandler() = default;
};

/// A handler for one negotiation. Credentials are not looked for yet. The process's environment is not changed, here or
/// later.
/// @throws Tarvel::InvalidArgumentException for a service that is empty or lacks one of its parts, a text with a null
///         character in it, and limits that are not positive.
SSOCLIENT_GSSAPI_API std::shared_ptr<SpnegoHandler> CreateSpnegoHandler(const SpnegoSettings &settings);

} // namespace SsoClient::Gssapi
