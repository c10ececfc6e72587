// SPDX-License-Identifier: Apache-2.0
/// @file
/// The locations of the project and of its built files.

#pragma once

#include <string>

namespace ToolTest {

/// The path of `name` in the project, such as "README.md".
std::string ProjectPath(const std::string &name);

/// The path of the tool, whose file name is "ssoclient".
std::string ToolPath();

/// The path of a library for preloading, which sends its process a signal at fsync.
std::string InterruptingFsyncPath();

/// The path of a library for preloading, which searches the memory of its process at the end.
std::string SearchingMemoryPath();

/// The path of the example that acquires a token by password.
std::string ExampleAcquirePath();

/// The path of the example that uses a service of another maker.
std::string ExampleOtherServicePath();

} // namespace ToolTest
