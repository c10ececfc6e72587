// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs whose limit of --timeout must end them at a certain stage, which a slow machine reaches late.

#pragma once

#include <string>

namespace ToolTest {

/// Calls `run` with the seconds of --timeout as text, each time twice as many, until the result shows that the tool has
/// reached the stage in that time. Returns the last result, after at most four runs.
template <typename Run, typename HasReached>
auto RunWithEnoughTime(const Run &run, const HasReached &hasReached) {
  constexpr int MAX_SECONDS = 16;
  int seconds = 2;
  auto result = run(std::to_string(seconds));
  while (!hasReached(result) && seconds < MAX_SECONDS) {
    seconds *= 2;
    result = run(std::to_string(seconds));
  }
  return result;
}

} // namespace ToolTest
