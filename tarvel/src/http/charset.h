// SPDX-License-Identifier: Apache-2.0
/// @file
/// The charset that the header of a response declares, and the conversion of the body to UTF-8.

#pragma once

#include <string>
#include <string_view>

namespace Tarvel::Http {

/// The charset parameter of a media type (RFC 9110, section 8.3), as written but without quotes. Empty when there is
/// none, or when its value is not the name of a charset: a token of at most 40 characters (RFC 2978, section 2.3).
std::string FindCharset(std::string_view contentType);

/// Converts a body that is declared as ISO-8859-1, under any of the names that IANA lists, to UTF-8. If the body also
/// begins with an XML declaration that says ISO-8859-1, the declaration is changed to UTF-8. The old memory of the body
/// is wiped. A body is not changed if it is declared as anything else, or if it is valid UTF-8 with characters beyond
/// ASCII: a wrong declaration is more likely than such a text in ISO-8859-1.
void RecodeToUtf8(std::string &body, std::string_view charset);

} // namespace Tarvel::Http
