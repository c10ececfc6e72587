// SPDX-License-Identifier: Apache-2.0
/// @file
/// The charset that the header of a response declares, and what it means for the body.

#pragma once

#include <string>
#include <string_view>

namespace Tarvel::Http {

/// The charset parameter of a media type (RFC 9110, section 8.3), as written but for its quotes. Empty without one,
/// and when it is not a charset's name: a token of at most 40 characters (RFC 2978, section 2.3).
std::string FindCharset(std::string_view contentType);

/// Makes UTF-8 of a body that is declared as ISO-8859-1, under any of the names that IANA lists. Left alone are a body that
/// is not ASCII and is UTF-8 already, as a wrong declaration is more likely than such text, and a body that is declared as
/// anything else. An XML declaration at its beginning that names ISO-8859-1 too then names UTF-8. What was there before is
/// wiped.
void RecodeToUtf8(std::string &body, std::string_view charset);

} // namespace Tarvel::Http
