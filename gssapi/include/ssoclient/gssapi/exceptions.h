// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a negotiation through the system's GSSAPI raises. Where the GSSAPI failed, a message ends with all that it has to
/// say: the texts of the major status, then those of the minor status, which are the mechanism's own words.

#pragma once

#include <ssoclient/exceptions.h>
#include <ssoclient/gssapi/export.h>

#include <string>

namespace SsoClient::Gssapi {

/// The client has no credentials to negotiate with: no ticket, an expired one, a cache or keytab that cannot be read, or
/// a key that the realm does not take. Nothing has been sent to the service.
class SSOCLIENT_GSSAPI_API GssCredentialException : public InvalidCredentialsException {
  TARVEL_EXCEPTION_BODY(GssCredentialException, InvalidCredentialsException);
};

/// The negotiation failed: the realm knows no such service or cannot be reached, a clock is wrong, the service's leg is
/// no answer to the client's, or the service did not prove who it is.
class SSOCLIENT_GSSAPI_API GssNegotiationException : public CommunicationException {
  TARVEL_EXCEPTION_BODY(GssNegotiationException, CommunicationException);
};

/// The negotiation reached one of the handler's limits.
class SSOCLIENT_GSSAPI_API GssLimitException : public GssNegotiationException {
  TARVEL_EXCEPTION_BODY(GssLimitException, GssNegotiationException);
};

} // namespace SsoClient::Gssapi
