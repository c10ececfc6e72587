// SPDX-License-Identifier: Apache-2.0

#include "program.h"

#include <algorithm>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <vector>

namespace Bench {

namespace {

class MedianReporter final : public benchmark::ConsoleReporter {
public:
  MedianReporter() : ConsoleReporter(OO_Tabular) {}

  void ReportRuns(const std::vector<Run> &runs) override {
    ConsoleReporter::ReportRuns(runs);
    for (const Run &run : runs) {
      if (run.error_occurred) {
        throw std::runtime_error(run.benchmark_name() + ": " + run.error_message);
      }
      if (run.run_type == Run::RT_Aggregate && run.aggregate_name == "median") {
        m_medians[run.run_name.str()] = Median{run.GetAdjustedCPUTime(), run.GetAdjustedRealTime()};
      }
    }
  }

  const Medians &GetMedians() const { return m_medians; }

private:
  Medians m_medians;
};

Medians RunInterleaved(const std::vector<std::string> &arguments) {
  std::vector<std::string> all = {"bench", "--benchmark_enable_random_interleaving=true", "--benchmark_repetitions=21",
                                  "--benchmark_min_time=0.05", "--benchmark_report_aggregates_only=true"};
  all.insert(all.end(), arguments.begin(), arguments.end());
  std::vector<char *> argv;
  std::transform(all.begin(), all.end(), std::back_inserter(argv), [](std::string &text) { return text.data(); });
  int argc = static_cast<int>(argv.size());
  benchmark::Initialize(&argc, argv.data());
  if (benchmark::ReportUnrecognizedArguments(argc, argv.data())) {
    throw std::runtime_error("unknown argument");
  }
  MedianReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  return reporter.GetMedians();
}

/// The value of the option `name` (such as "--json"), which is removed from `arguments`; empty without it.
std::string TakeOption(std::vector<std::string> &arguments, const std::string &name) {
  const auto option = std::find(arguments.begin(), arguments.end(), name);
  if (option == arguments.end() || option + 1 == arguments.end()) {
    return "";
  }
  std::string value = *(option + 1);
  arguments.erase(option, option + 2);
  return value;
}

void Run(const Program &program, std::vector<std::string> arguments) {
  const std::string json = TakeOption(arguments, "--json");
  const auto quick = std::find(arguments.begin(), arguments.end(), "--quick");
  if (quick != arguments.end()) {
    *quick = "--benchmark_repetitions=2";
    arguments.emplace_back("--benchmark_min_time=0.001");
  }
  program.registerBenchmarks();
  const Medians medians = RunInterleaved(arguments);
  if (json.empty()) {
    program.writeSummary(medians, std::cout);
    return;
  }
  std::ofstream file(json);
  program.writeSummary(medians, file);
  if (!file.flush()) {
    throw std::runtime_error("cannot write " + json);
  }
}

} // namespace

int RunProgram(const Program &program, int argc, char **argv) {
  try {
    Run(program, {argv + 1, argv + argc});
    return EXIT_SUCCESS;
  } catch (const std::exception &error) {
    std::cerr << program.name << ": " << error.what() << '\n';
    return EXIT_FAILURE;
  }
}

std::string ReadFile(const std::string &path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error("cannot read " + path);
  }
  return {std::istreambuf_iterator<char>(file), {}};
}

} // namespace Bench
