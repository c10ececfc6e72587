// SPDX-License-Identifier: Apache-2.0

#include "support/resident_memory.h"

#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

namespace Testing {

double ResidentKilobytes() {
  std::ifstream status("/proc/self/status");
  for (std::string word; status >> word;) {
    double kilobytes = 0;
    if (word == "VmRSS:" && status >> kilobytes) {
      return kilobytes;
    }
  }
  throw std::runtime_error("/proc/self/status does not show the resident memory");
}

std::size_t CountThreadsOfLibrary() {
  std::size_t threads = 0;
  for (const std::filesystem::directory_entry &task : std::filesystem::directory_iterator("/proc/self/task")) {
    std::ifstream comm(task.path() / "comm");
    std::string name;
    std::getline(comm, name); // empty if the thread has ended in the meantime
    if (name.rfind("tarvel-", 0) == 0) {
      ++threads;
    }
  }
  return threads;
}

} // namespace Testing
