// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the library raises.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/core/exception.h>

#include <string>

namespace SsoClient {

/// Any failure of the library without a class of its own; the root of the library's exceptions. Bad arguments and
/// misuse are the platform's `InvalidArgumentException` and `InvalidStateException`, which are not of this family.
class SSOCLIENT_API SsoException : public Tarvel::Exception {
  TARVEL_EXCEPTION_BODY(SsoException, Tarvel::Exception);
};

/// A token that is not accepted. Only its two subclasses are raised.
class SSOCLIENT_API InvalidTokenException : public SsoException {
  TARVEL_EXCEPTION_BODY(InvalidTokenException, SsoException);
};

/// A token whose signature does not verify.
class SSOCLIENT_API InvalidSignatureException : public InvalidTokenException {
  TARVEL_EXCEPTION_BODY(InvalidSignatureException, InvalidTokenException);
};

/// Token XML that is not of the form that tokens have, or a token that is inconsistent, expired or not valid yet.
class SSOCLIENT_API ParseException : public InvalidTokenException {
  TARVEL_EXCEPTION_BODY(ParseException, InvalidTokenException);
};

/// The exchange with the service failed below the level of its messages.
class SSOCLIENT_API CommunicationException : public SsoException {
  TARVEL_EXCEPTION_BODY(CommunicationException, SsoException);
};

/// The service rejected the caller's credentials.
class SSOCLIENT_API InvalidCredentialsException : public SsoException {
  TARVEL_EXCEPTION_BODY(InvalidCredentialsException, SsoException);
};

} // namespace SsoClient
