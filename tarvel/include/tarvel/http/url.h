// SPDX-License-Identifier: Apache-2.0
/// @file
/// Parsing of http and https URLs.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>

#include <string>
#include <string_view>

namespace Tarvel::Http {

/// A text that is not an http or https URL that can be asked; the message names the URL (without user information, which
/// may hold a password) and what is wrong with it.
class TARVEL_API MalformedURLException : public Exception {
  TARVEL_EXCEPTION_BODY(MalformedURLException, Exception);
};

/// Takes a URL (RFC 3986) apart.
/// @param isSecure true for https. @param host as given, without brackets for an IPv6 address. @param port the given one,
///        or 80 or 443. @param path path and query as sent in the request line, escapes kept, "/" when there is none; a
///        fragment is dropped.
/// @throws MalformedURLException for anything but http and https, a missing host, a host that is no name, no complete
///         IPv4 address and no IPv6 address (one with a zone included), or is not ASCII, a port outside 1 to 65535, user
///         information, or characters that may not stand in a URL. The outputs are left alone then.
TARVEL_API void ParseHttpURL(std::string_view url, bool &isSecure, std::string &host, int &port, std::string &path);

} // namespace Tarvel::Http
