// SPDX-License-Identifier: Apache-2.0
/// @file
/// The dates in HTTP headers.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <string_view>

namespace Tarvel::Http {

/// The date in `text`, the value of a header such as Date, in any of the forms of RFC 9110, section 5.6.7. It is read as
/// leniently as the date of a cookie (RFC 6265, section 5.1.1). `boost::none` when `text` contains no date.
TARVEL_API boost::optional<System::DateTime> ParseHttpDate(std::string_view text);

} // namespace Tarvel::Http
