// SPDX-License-Identifier: Apache-2.0

#include "host_programs.h"

#include "support/data_file.h"

#include <array>
#include <cstdio>
#include <stdexcept>
#include <sys/wait.h>

namespace Testing {

const char *const EARLY_HOST_PROGRAM = EARLY_HOST;
const char *const LATE_HOST_PROGRAM = LATE_HOST;
const char *const IN_FLIGHT_HOST_PROGRAM = IN_FLIGHT_HOST;
const char *const CLIENT_IN_FLIGHT_HOST_PROGRAM = CLIENT_IN_FLIGHT_HOST;

std::string RunHost(const char *program, const std::string &environment) {
  const std::string command = "exec env DATA='" + DataPath("") + "' " + environment + " '" + program + "' 2>&1";
  std::FILE *const output = ::popen(command.c_str(), "r");
  if (!output) {
    throw std::runtime_error("popen");
  }
  std::string text;
  std::array<char, 4096> some{};
  while (const std::size_t count = std::fread(some.data(), 1, some.size(), output)) {
    text.append(some.data(), count);
  }
  const int status = ::pclose(output);
  if (status != 0) {
    text += "ended with " + std::to_string(WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status)) + "\n";
  }
  return text;
}

} // namespace Testing
