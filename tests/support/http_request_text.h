// SPDX-License-Identifier: Apache-2.0
/// @file
/// HTTP requests as text, in the form of the files in tests/data/http: a line with the method and the target, a line for each
/// header field, an empty line, and the content.

#pragma once

#include <ssoclient/proof/http_request.h>

#include <string>

namespace Testing {

/// The request that `text` contains. A line that begins with a blank continues the field before it (RFC 9112, section 5.2). Every
/// text is a request, although most are not valid. A request without content has no body.
SsoClient::HttpRequest ParseHttpRequest(const std::string &text);

/// The text of a request, whose fields must not have folded lines.
std::string WriteHttpRequest(const SsoClient::HttpRequest &request);

} // namespace Testing
