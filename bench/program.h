// SPDX-License-Identifier: Apache-2.0
/// @file
/// Code that the benchmark programs share: it runs a program's benchmarks interleaved, keeps the medians and writes the
/// summary.

#pragma once

#include <benchmark/benchmark.h>

#include <iosfwd>
#include <map>
#include <string>

namespace Bench {

/// The time of one benchmark, the median of its repetitions, in microseconds for each iteration.
struct Median {
  double cpuUs = 0;  ///< of the measuring thread
  double wallUs = 0; ///< with several threads, the wall time divided by the iterations of all of them
};

using Medians = std::map<std::string, Median>; // by the benchmark's name, such as "CreateSamlToken/threads:2"

/// One benchmark program.
struct Program {
  const char *name;
  void (*registerBenchmarks)();
  /// Writes one JSON object with one member, named after the program. The first and last lines are the object's braces.
  void (*writeSummary)(const Medians &medians, std::ostream &out);
};

/// The body of `main`. Runs all registered benchmarks, their repetitions in random order, so that a slow period of the
/// machine affects all of them. Prints the figures to standard output, and writes the summary there or to the file of
/// the option --json. With --quick each benchmark runs only for a moment. Google Benchmark's own options work too.
/// @returns the result of `main`; a failure is reported on standard error.
int RunProgram(const Program &program, int argc, char **argv);

/// The bytes of a file. @throws std::runtime_error when it cannot be read.
std::string ReadFile(const std::string &path);

} // namespace Bench
