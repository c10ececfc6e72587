// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs programs that are statically linked with the library.

#pragma once

#include <string>

namespace Testing {

/// A program that uses the library in its first static object.
extern const char *const EARLY_HOST_PROGRAM;
/// A program whose threads use the library while static objects are being destroyed.
extern const char *const LATE_HOST_PROGRAM;
/// A program that ends while a request over TLS is under way.
extern const char *const IN_FLIGHT_HOST_PROGRAM;
/// A program that ends while operations of a client over TLS are under way.
extern const char *const CLIENT_IN_FLIGHT_HOST_PROGRAM;

/// Runs `program` to its end, with `environment` ("NAME=VALUE NAME=VALUE") and the folder of the test data in DATA.
/// Returns its output, followed by "ended with N" when its exit code N, in the shell's form, is not 0.
std::string RunHost(const char *program, const std::string &environment = {});

} // namespace Testing
