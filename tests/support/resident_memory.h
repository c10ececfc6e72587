// SPDX-License-Identifier: Apache-2.0
/// @file
/// The resident memory of this process, and the library's threads in it.

#pragma once

#include <cstddef>

namespace Testing {

/// In units of 1024 octets. @throws std::runtime_error
double ResidentKilobytes();

/// The threads of this process whose names begin with "tarvel-". Those that look up names are among them, until they
/// have been idle for half a second.
std::size_t CountThreadsOfLibrary();

} // namespace Testing
