// SPDX-License-Identifier: Apache-2.0
/// @file
/// Messages to the echo service: written as text, and signed by xmlsec1.

#pragma once

#include "messages.h"
#include "tls_client.h"

#include <ssoclient/saml_token.h>
#include <tarvel/system/date_time.h>

#include <string>
#include <vector>

namespace DevStsTest {

/// The parts of a message, each as text. A test changes some of them before the message is signed.
struct EchoMessage {
  explicit EchoMessage(const SsoClient::SamlToken &presented);

  /// Makes it a message of SOAP 1.2.
  EchoMessage &UseSoap12();
  /// Sets the times of the timestamp, in seconds from now.
  EchoMessage &SetPeriod(int created, int expires);

  /// The message without a signature.
  std::string Write() const;
  /// The message, signed with this private key of the service's state folder.
  std::string Sign(const Testing::DevSts &service, const std::string &identity = "client") const;

  std::string soap = "http://schemas.xmlsoap.org/soap/envelope/";
  std::string contentType = "text/xml; charset=utf-8";
  std::string blocks;             ///< header blocks before the security header
  std::string securityAttributes; ///< such as an actor
  std::string created;
  std::string expires;
  std::string token;
  std::string keyInfo;                                  ///< the content of ds:KeyInfo
  std::vector<std::string> references = {"ts", "body"}; ///< what is signed; the timestamp and the body have these names
  std::string body = "<m:Order xmlns:m=\"urn:example:orders\">7</m:Order>";
};

/// A reference to the token with this identifier, as `SecurityTokenReference`.
std::string ReferenceToToken(const std::string &id, const std::string &tokenType);

/// Sends `text`, which has the form of `message`.
HttpAnswer SendToEcho(const Testing::DevSts &service, const EchoMessage &message, const std::string &text);

/// The answer of the echo service to `message` with this token.
std::string EchoOf(const EchoMessage &message, const SsoClient::SamlToken &token, const std::string &subject,
                   const std::string &proof);

} // namespace DevStsTest
