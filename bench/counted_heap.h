// SPDX-License-Identifier: Apache-2.0
/// @file
/// How much memory `operator new` has handed out in this program, for programs of one thread.

#pragma once

#include <cstddef>

namespace Bench {

/// Forgets earlier peaks. @return the octets that are held now.
std::size_t StartCountingHeap();

/// The most octets that were held at once since `StartCountingHeap`.
std::size_t GetMostHeap();

} // namespace Bench
