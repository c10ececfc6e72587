// SPDX-License-Identifier: Apache-2.0
/// @file
/// Logs an exception that reached the end of one of the platform's threads or callbacks.

#pragma once

#include <string_view>

namespace Tarvel::Service {

/// Writes the exception that is being handled to the logger "Tarvel" at level 8, in the form "An exception left %1:
/// <class>: <message>" with `place` for %1. If it is not a `std::exception`, the line says so in place of class and
/// message. Never throws.
void LogUncaughtException(std::string_view place) noexcept;

} // namespace Tarvel::Service
