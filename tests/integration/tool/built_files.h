// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where the project and what is built of it are.

#pragma once

#include <string>

namespace ToolTest {

/// The path of `name` in the project, such as "README.md".
std::string ProjectPath(const std::string &name);

/// The path of the tool, whose file name is "ssoclient".
std::string ToolPath();

/// The path of the library that, preloaded, sends its process a signal at fsync.
std::string InterruptingFsyncPath();

} // namespace ToolTest
