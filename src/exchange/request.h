// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Request`, one message ready to be posted.

#pragma once

#include <string>

namespace SsoClient {

/// A serialised SOAP envelope and the action to post it with. The envelope may carry a password or a bearer token, so
/// each record wipes its own when it is destroyed or overwritten.
struct Request {
  /// The only values of `soapAction`. The spelling of `CHALLANGE`, and that it alone is below "RSTR", must stay.
  static const char *const ISSUE;
  static const char *const RENEW;
  static const char *const VALIDATE;
  static const char *const CHALLANGE;

  Request() = default;
  Request(const Request &) = default;
  Request(Request &&) noexcept = default;
  Request &operator=(Request other) noexcept; ///< takes copies and temporaries alike; wipes what was here before
  ~Request();

  std::string soapAction; ///< value of the `SOAPAction` HTTP header, without quotes
  std::string body;       ///< the whole envelope; secret
};

} // namespace SsoClient
