// SPDX-License-Identifier: Apache-2.0
/// @file
/// How much memory `operator new` has allocated in this program, for programs with one thread.

#pragma once

#include <cstddef>

namespace Bench {

/// Discards earlier peaks. @return the octets that are allocated now.
std::size_t StartCountingHeap();

/// The most octets that were allocated at once since `StartCountingHeap`.
std::size_t GetMostHeap();

} // namespace Bench
