// SPDX-License-Identifier: Apache-2.0
// Preloaded into the tool by a test: the process gets the signal whose number is in the environment while it has a file
// written and not yet put in its place.

#include <csignal>
#include <cstdlib>

#include <unistd.h>

extern "C" __attribute__((visibility("default"))) int fsync(int) {
  if (const char *signal = std::getenv("SIGNAL_AT_FSYNC")) {
    kill(getpid(), std::atoi(signal));
  }
  return 0;
}
