// SPDX-License-Identifier: Apache-2.0
/// @file
/// The files under tests/data: their paths and their content.

#pragma once

#include <string>

namespace Testing {

/// The path of tests/data/`name`.
std::string DataPath(const std::string &name);

/// The bytes of tests/data/`name`. @throws std::runtime_error when the file cannot be read.
std::string ReadDataFile(const std::string &name);

} // namespace Testing
