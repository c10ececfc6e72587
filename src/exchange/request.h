// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Request`, one message ready to be posted.

#pragma once

#include "exchange/response_facts.h"

#include <memory>
#include <string>

namespace SsoClient {

/// A serialised SOAP envelope and the action to post it with. The envelope may carry a password or a bearer token, so
/// the body is wiped when the record is destroyed or overwritten.
struct Request {
  /// The only values of `soapAction`. Two oddities of `CHALLANGE` must stay: its spelling, and its path, the only
  /// one that begins with "/RSTR".
  static const char *const ISSUE;
  static const char *const RENEW;
  static const char *const VALIDATE;
  static const char *const CHALLANGE;

  Request() = default;
  Request(const Request &) = default;
  Request(Request &&) noexcept = default;
  Request &operator=(Request other) noexcept; ///< copies or moves; wipes the old body
  ~Request();

  std::string soapAction; ///< value of the `SOAPAction` HTTP header, without quotes
  std::string body;       ///< the whole envelope; secret

  /// Whether the `Content-Type` HTTP header declares the charset of the body.
  bool declaresCharset = false;

  /// Where the transport writes the facts of the response. Null, the default, if the caller does not need them.
  std::shared_ptr<ResponseFacts> facts;
};

} // namespace SsoClient
