// SPDX-License-Identifier: Apache-2.0
/// @file
/// The wrong answers of the development service, each with the exception that an operation throws for it.

#pragma once

#include <functional>
#include <string>

namespace Testing {

struct WrongAnswer {
  const char *fault;
  /// "CLASS: MESSAGE" of the exception. %e is the endpoint. Parts that differ between answers are replaced: lines,
  /// columns and lengths by "#", dates by "DATE".
  const char *outcome;
};

/// Wrong answers to every operation.
inline const WrongAnswer TO_ALL[] = {
    {"reset", "CommunicationException: The TLS connection to localhost broke: The connection to %e broke: Connection "
              "reset by peer"},
    {"reset-in-header", "CommunicationException: The TLS connection to localhost broke: The connection to %e broke: "
                        "Connection reset by peer"},
    {"reset-in-body", "CommunicationException: The TLS connection to localhost broke: The connection to %e broke: "
                      "Connection reset by peer"},
    {"truncate", "CommunicationException: Bad response from %e: the connection ended after # of the body's # bytes"},
    {"oversize", "CommunicationException: Bad response from %e: the body is longer than 16777216 bytes"},
    {"bad-status", "CommunicationException: Server returned error: 503 Service Unavailable"},
    {"bad-status-404", "CommunicationException: Server returned error: 404 Not Found"},
    {"bad-status-302", "CommunicationException: Server returned error: 302 Status"},
    {"bad-content-length",
     "CommunicationException: Bad response from %e: its header is not HTTP/1.x (bad Content-Length)"},
    {"garbage", "CommunicationException: Bad response from %e: its header is not HTTP/1.x (bad version)"},
    {"bad-status-200", "SsoException: Response is not well-formed XML: text comes before the document element at "
                       "line #, column #"},
    {"bad-status-500", "SsoException: Response is not well-formed XML: text comes before the document element at "
                       "line #, column #"},
    {"garbled-xml", "SsoException: Response is not well-formed XML: the element 'soapenv:Envelope' of line 1 has "
                    "another end tag at line #, column #"},
    {"doctype", "SsoException: Response is not well-formed XML: a document type declaration is not accepted at line "
                "#, column #"},
    {"too-deep",
     "SsoException: Response is not well-formed XML: elements are nested deeper than 256 at line #, column #"},
    {"empty-body", "SsoException: Response is not well-formed XML: the document is empty at line #, column #"},
    {"not-soap", "SsoException: Unexpected response format: missing SAOP Body."},
    {"wrong-root", "SsoException: Unexpected response format: missing SAOP Body."},
    {"no-token", "SsoException: Unexpected XML format"},
    {"wrong-element", "SsoException: Unexpected XML format"},
    {"wrong-wrapper", "SsoException: Unexpected XML format"},
    {"soap-fault-without-code", "SsoException: Invalid SOAP response: missing faultcode."},
    {"soap-fault-without-text", "InvalidCredentialsException: Authentication failed"},
    {"soap-fault-FailedAuthentication", "InvalidCredentialsException: Authentication failed: a fault was asked for"},
    {"soap-fault-InvalidSecurityToken", "InvalidCredentialsException: Authentication failed: a fault was asked for"},
    {"soap-fault-wsse-InvalidSecurityToken",
     "InvalidCredentialsException: Authentication failed: a fault was asked for"},
    {"soap-fault-wsse-FailedAuthentication",
     "SsoException: Unexpected SOAP fault: wsse:FailedAuthentication; request failed."},
    {"soap-fault-InvalidRequest", "SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed."},
    {"soap-fault-RequestFailed", "SsoException: Unexpected SOAP fault: wst:RequestFailed; request failed."},
    {"soap-fault-InvalidTimeRange", "SsoException: Unexpected SOAP fault: wst:InvalidTimeRange; request failed."},
    {"soap-fault-UnableToRenew", "SsoException: Unexpected SOAP fault: wst:UnableToRenew; request failed."},
    {"soap-fault-InvalidSecurity", "SsoException: Unexpected SOAP fault: wsse:InvalidSecurity; request failed."},
    {"soap-fault-FailedCheck", "SsoException: Unexpected SOAP fault: wsse:FailedCheck; request failed."},
    {"soap-fault-MessageExpired", "SsoException: Unexpected SOAP fault: wsu:MessageExpired; request failed."},
    {"soap-fault-Unknown", "SsoException: Unexpected SOAP fault: devsts:Unknown; request failed."},
};

/// Wrong answers to operations that request a token.
inline const WrongAnswer INSTEAD_OF_A_TOKEN[] = {
    {"expired-token", "SsoException: The token has expired at: DATE"},
    {"early-token", "SsoException: Token start date is in the future: DATE"},
    {"tampered-token", "InvalidSignatureException: Failed to verify signature: token might have been tampered with."},
    {"wrong-signer", "InvalidSignatureException: Failed to verify signature: token might have been tampered with."},
    {"unsigned-token", "SsoException: Signature syntax error: Expected ds:Signature, found \"saml:Subject\" at line #, "
                       "column #"},
    {"no-subject", "SsoException: Expected element 'Subject' not found."},
    {"unknown-element", "SsoException: Unexpected elements under Assertion"},
    {"wrong-version", "SsoException: Invalid token version"},
};

/// The outcome of `operation` on the service that listens at `port`: its result, or "CLASS: MESSAGE" as in
/// `WrongAnswer`.
std::string OutcomeOf(const std::function<std::string()> &operation, int port);

} // namespace Testing
