// SPDX-License-Identifier: Apache-2.0
/// @file
/// Running a program that the library is linked into statically.

#pragma once

#include <string>

namespace Testing {

/// The program that uses the library in a static object before all others.
extern const char *const EARLY_HOST_PROGRAM;
/// The program whose workers use the library while static objects are being destroyed.
extern const char *const LATE_HOST_PROGRAM;
/// The program that ends while a request over TLS is under way.
extern const char *const IN_FLIGHT_HOST_PROGRAM;

/// Runs `program` with `environment` ("NAME=VALUE NAME=VALUE") and the folder of the test data in DATA, to its end. What
/// it printed, and "ended with N" when N, as the shell has it, is not 0.
std::string RunHost(const char *program, const std::string &environment = {});

} // namespace Testing
