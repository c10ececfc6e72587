// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exceptions of the client.
///
/// `SsoException` is the base of these classes only. The library also throws exceptions of the platform, which do not
/// derive from it: `Tarvel::InvalidArgumentException`, `Tarvel::InvalidStateException`, `Tarvel::OutOfMemoryException`,
/// `Tarvel::Http::MalformedURLException`, `Tarvel::Xml::XMLParseException` and
/// `Tarvel::Xml::Security::XmlSecurityException`. Catch `Tarvel::Exception`, the base of all of them, to catch every failure
/// of the library except `std::bad_alloc`.
///
/// An exception carries a message and no further fields. Where programs may rely on the beginning of a message, the
/// comments below quote it.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/core/exception.h>

#include <string>

namespace SsoClient {

/// A failure of an operation for which there is no more specific class. When the service answers with a fault, the
/// message is "Unexpected SOAP fault: CODE; request failed.", where CODE is the fault code as the service wrote it.
class SSOCLIENT_API SsoException : public Tarvel::Exception {
  TARVEL_EXCEPTION_BODY(SsoException, Tarvel::Exception);
};

/// A token that is not accepted. Only its two subclasses are thrown.
class SSOCLIENT_API InvalidTokenException : public SsoException {
  TARVEL_EXCEPTION_BODY(InvalidTokenException, SsoException);
};

/// A token whose signature does not verify. The message begins with "Failed to verify signature: " when token, signature and
/// trusted keys do not match, and with "Signature verification error. " when the signature cannot be checked.
class SSOCLIENT_API InvalidSignatureException : public InvalidTokenException {
  TARVEL_EXCEPTION_BODY(InvalidSignatureException, InvalidTokenException);
};

/// A token that does not have the form of a token, or is inconsistent, expired or not valid yet. The message begins
/// with "The token has expired at: " for an expired token, and with "Token start date is in the future: " for one that
/// is not valid yet.
class SSOCLIENT_API ParseException : public InvalidTokenException {
  TARVEL_EXCEPTION_BODY(ParseException, InvalidTokenException);
};

/// The service cannot be reached, the connection failed or took too long, or the HTTP status is an error. For such a
/// status, the message is "Server returned error: CODE REASON", where CODE is the status in decimal. Other texts may
/// change.
class SSOCLIENT_API CommunicationException : public SsoException {
  TARVEL_EXCEPTION_BODY(CommunicationException, SsoException);
};

/// The service refused the caller's credentials. The message is "Authentication failed", or "Authentication failed: TEXT"
/// with the service's own text.
class SSOCLIENT_API InvalidCredentialsException : public SsoException {
  TARVEL_EXCEPTION_BODY(InvalidCredentialsException, SsoException);
};

} // namespace SsoClient
