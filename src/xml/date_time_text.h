// SPDX-License-Identifier: Apache-2.0
/// @file
/// The date-times in requests: their value and their text.

#pragma once

#include <tarvel/system/date_time.h>

#include <string>

namespace SsoClient {

/// `date` plus `minutes`, which may be negative, in UTC. The offset wraps beyond 35 minutes in either direction.
Tarvel::System::DateTime AddMinutesToDate(const Tarvel::System::DateTime &date, int minutes);

/// `date` in the form xsd:dateTime with three fraction digits and its zone, for example 2013-05-07T09:03:01.042Z.
std::string DateTimeFormatter(const Tarvel::System::DateTime &date);

} // namespace SsoClient
