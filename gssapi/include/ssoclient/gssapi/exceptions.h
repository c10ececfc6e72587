// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exceptions of a negotiation through the system's GSSAPI. When the GSSAPI has failed, the message ends with its
/// texts: those of the major status, then those of the minor status, which are the mechanism's own.

#pragma once

#include <ssoclient/exceptions.h>
#include <ssoclient/gssapi/export.h>

#include <string>

namespace SsoClient::Gssapi {

/// The client has no credentials to negotiate with: there is no ticket, it has expired, a cache or keytab cannot be
/// read, or the realm does not accept the key. Nothing has been sent to the service.
class SSOCLIENT_GSSAPI_API GssCredentialException : public InvalidCredentialsException {
  TARVEL_EXCEPTION_BODY(GssCredentialException, InvalidCredentialsException);
};

/// The negotiation failed: the realm does not know the service or cannot be reached, a clock is wrong, the service's
/// leg is not an answer to the client's, or the service did not prove its identity.
class SSOCLIENT_GSSAPI_API GssNegotiationException : public CommunicationException {
  TARVEL_EXCEPTION_BODY(GssNegotiationException, CommunicationException);
};

/// The negotiation reached one of the handler's limits.
class SSOCLIENT_GSSAPI_API GssLimitException : public GssNegotiationException {
  TARVEL_EXCEPTION_BODY(GssLimitException, GssNegotiationException);
};

} // namespace SsoClient::Gssapi
