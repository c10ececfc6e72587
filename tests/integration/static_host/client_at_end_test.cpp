// SPDX-License-Identifier: Apache-2.0
// The end of a process while operations of its client are under way.
#include "host_programs.h"

#include "support/completion.h"
#include "support/scripted_server.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>

namespace Testing {
namespace {

/// Runs the program ten times against a service that never answers, and expects this output.
void ExpectToEnd(const std::string &mode, const std::string &output) {
  const ScriptedServer silent(
      [](ServerConnection &peer) {
        if (peer.Handshake()) {
          peer.ReadRequest();
        }
        peer.Stall();
      },
      TlsSettings());
  for (int i = 0; i < 10; ++i) {
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(RunHost(CLIENT_IN_FLIGHT_HOST_PROGRAM,
                      "MODE=" + mode + " HTTPS=https://localhost:" + std::to_string(silent.GetPort()) + "/sts"),
              output);
    EXPECT_LT(std::chrono::steady_clock::now() - start, PATIENCE); // the time-out of a request is four minutes
  }
}

TEST(EndOfAProcessWithOperationsUnderWay, DoesNotWaitForAClientThatIsNeverDestroyed) {
  ExpectToEnd("never-destroyed", "main ends\n");
}

TEST(EndOfAProcessWithOperationsUnderWay, DoesNotWaitForAStaticClient) {
  ExpectToEnd("static", "main ends\n");
}

TEST(EndOfAProcessWithOperationsUnderWay, EndsAnOperationThatBeginsInAnExitHandler) {
  ExpectToEnd("at-exit", "main ends\natexit: CommunicationException\n");
}

TEST(EndOfAProcessWithOperationsUnderWay, DoesNotWaitForDetachedThreads) {
  ExpectToEnd("detached", "main ends\n");
}

} // namespace
} // namespace Testing
