// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the benchmark programs share: running side by side, keeping the medians, writing their summary.

#pragma once

#include <benchmark/benchmark.h>

#include <iosfwd>
#include <map>
#include <string>

namespace Bench {

/// What one benchmark took, the median of its repetitions, in microseconds an iteration.
struct Median {
  double cpuUs = 0;  ///< of the measuring thread
  double wallUs = 0; ///< with several threads, the wall time divided by the iterations of all of them
};

using Medians = std::map<std::string, Median>; // by the benchmark's name, as "CreateSamlToken/threads:2"

/// One benchmark program.
struct Program {
  const char *name;
  void (*registerBenchmarks)();
  /// Writes one JSON object with one member, the program's name, the object's braces on lines of their own.
  void (*writeSummary)(const Medians &medians, std::ostream &out);
};

/// What `main` does: runs all registered benchmarks, their repetitions shuffled among each other so that a slow spell of
/// the machine falls on all of them, prints the figures to standard output and writes the summary there, or to the file
/// that the option --json names. With --quick each runs for a moment only. Google Benchmark's own options are obeyed.
/// @returns what `main` returns; a failure is told on standard error.
int RunProgram(const Program &program, int argc, char **argv);

/// The bytes of a file. @throws std::runtime_error when it cannot be read.
std::string ReadFile(const std::string &path);

} // namespace Bench
