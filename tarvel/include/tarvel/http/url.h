// SPDX-License-Identifier: Apache-2.0
/// @file
/// Parsing of http and https URLs.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>

#include <string>
#include <string_view>

namespace Tarvel::Http {

/// A text that is not an http or https URL to which a request can be sent. The message contains the URL (without user
/// information, which may contain a password) and what is wrong with it.
class TARVEL_API MalformedURLException : public Exception {
  TARVEL_EXCEPTION_BODY(MalformedURLException, Exception);
};

/// Splits a URL (RFC 3986) into its parts.
/// @param isSecure true for https.
/// @param host as given, but an IPv6 address without its brackets.
/// @param port the port in the URL; if it has none, 80, or 443 for https.
/// @param path path and query as sent in the request line, escapes kept; "/" when the URL has neither. A fragment is
///        dropped.
/// @throws MalformedURLException for a scheme other than http and https; a missing host; a host that is not ASCII, or
///         is neither a name, nor a complete IPv4 address, nor an IPv6 address without a zone; a port outside 1 to
///         65535; user information; characters that are not allowed in a URL. The outputs are then unchanged.
TARVEL_API void ParseHttpURL(std::string_view url, bool &isSecure, std::string &host, int &port, std::string &path);

} // namespace Tarvel::Http
