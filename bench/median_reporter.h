// SPDX-License-Identifier: Apache-2.0
/// @file
/// Running benchmarks side by side and keeping their medians.

#pragma once

#include <benchmark/benchmark.h>

#include <map>
#include <string>
#include <vector>

namespace Bench {

/// What one benchmark took, the median of its repetitions, in microseconds an iteration.
struct Median {
  double cpuUs = 0;  ///< of the measuring thread
  double wallUs = 0; ///< with several threads, the wall time divided by the iterations of all of them
};

using Medians = std::map<std::string, Median>; // by the benchmark's name, as "CreateSamlToken/threads:2"

/// Runs all registered benchmarks, their repetitions shuffled among each other so that a slow spell of the machine falls on
/// all of them, and prints the figures to standard output.
/// @param arguments of the program; those of Google Benchmark's are obeyed.
Medians RunInterleaved(const std::vector<std::string> &arguments);

/// The value of the option `name` ("--json") among `arguments`; empty without it.
std::string TakeOption(std::vector<std::string> &arguments, const std::string &name);

} // namespace Bench
