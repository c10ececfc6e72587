// SPDX-License-Identifier: Apache-2.0
// A test preloads this into the tool. It sends the process a signal, whose number is in the environment, when a file
// has been written and does not have its final name yet. With a second signal in the
// environment, it sends that, too, and never returns.

#include <csignal>
#include <cstdlib>

#include <unistd.h>

extern "C" __attribute__((visibility("default"))) int fsync(int) {
  if (const char *signal = std::getenv("SIGNAL_AT_FSYNC")) {
    kill(getpid(), std::atoi(signal));
    if (const char *second = std::getenv("SECOND_SIGNAL_AT_FSYNC")) {
      kill(getpid(), std::atoi(second));
      for (;;) {
        pause();
      }
    }
  }
  return 0;
}
