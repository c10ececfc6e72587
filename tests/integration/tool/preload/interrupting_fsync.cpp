// SPDX-License-Identifier: Apache-2.0
// A test preloads this into the tool. When the tool has written a file that does not have its final name yet, this
// `fsync` sends the process the signal SIGNAL_AT_FSYNC of the environment, and then takes as long as on a slow disk. If
// SECOND_SIGNAL_AT_FSYNC is set, it sends that signal, too, and never returns.

#include <csignal>
#include <cstdlib>

#include <unistd.h>

namespace {

/// Several times longer than a command has to end by itself at a signal.
constexpr useconds_t SLOW_DISK_MICROSECONDS = 100'000;

} // namespace

extern "C" __attribute__((visibility("default"))) int fsync(int) {
  if (const char *signal = std::getenv("SIGNAL_AT_FSYNC")) {
    kill(getpid(), std::atoi(signal));
    if (const char *second = std::getenv("SECOND_SIGNAL_AT_FSYNC")) {
      kill(getpid(), std::atoi(second));
      for (;;) {
        pause();
      }
    }
    usleep(SLOW_DISK_MICROSECONDS);
  }
  return 0;
}
