// SPDX-License-Identifier: Apache-2.0
/// @file
/// The date-times that requests carry: their value and their text.

#pragma once

#include <tarvel/system/date_time.h>

#include <string>

namespace SsoClient {

/// `date`, in UTC, `minutes` later, or earlier when negative; more than 35 minutes either way wrap.
Tarvel::System::DateTime AddMinutesToDate(const Tarvel::System::DateTime &date, int minutes);

/// `date` in the form xsd:dateTime with three fraction digits and its zone, as 2013-05-07T09:03:01.042Z.
std::string DateTimeFormatter(const Tarvel::System::DateTime &date);

} // namespace SsoClient
