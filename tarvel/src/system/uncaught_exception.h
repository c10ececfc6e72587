// SPDX-License-Identifier: Apache-2.0
/// @file
/// What becomes of an exception that nobody caught on one of the platform's threads: a log line.

#pragma once

#include <string_view>

namespace Tarvel::System {

/// Called while an exception is being handled: writes it to the logger "Tarvel" at level 8, as "An exception left %1:
/// <class>: <message>" with `place` for %1. Does nothing more, and never throws.
void LogUncaughtException(std::string_view place) noexcept;

} // namespace Tarvel::System
