// SPDX-License-Identifier: Apache-2.0
// Use of the library by the host's threads while static objects wait for them.
#include "host_programs.h"

#include "support/completion.h"
#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <string>

namespace Testing {
namespace {

TEST(StaticObjectThatJoinsAThread, WaitsForTheThreadsComputation) {
  EXPECT_EQ(RunHost(LATE_HOST_PROGRAM),
            "main ends\n"
            "tokens/bearer.xml: {Name: alice; Domain:corp.example}\n"
            "tokens/signed-by-other.xml failed: "
            "Failed to verify signature: token might have been tampered with.\n"
            "joined\n"
            "computed: {Name: alice; Domain:corp.example}\n"
            "tokens/expired.xml failed: The token has expired at: 2021-01-01T00:00:00.000Z\n"
            "joined\n");
}

// If it waited, the process would end only after four minutes, the time-out of the request.
TEST(StaticObjectThatJoinsAThread, DoesNotWaitForAResponseOverTls) {
  std::promise<void> promise;
  const std::shared_future<void> requested = promise.get_future().share();
  const ScriptedServer stalling(
      [&promise](ServerConnection &peer) {
        if (peer.Handshake() && !peer.ReadRequest().empty()) {
          promise.set_value();
        }
        peer.Stall();
      },
      TlsSettings());
  const std::string body = IssueResponse(ReadDataFile("tokens/bearer.xml"));
  const ScriptedServer waiting([&](ServerConnection &peer) {
    peer.ReadRequest();
    requested.wait_for(PATIENCE);
    peer.Write("HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body);
  });
  const auto start = std::chrono::steady_clock::now();
  const std::string output =
      RunHost(IN_FLIGHT_HOST_PROGRAM, "HTTPS=https://localhost:" + std::to_string(stalling.GetPort()) +
                                          "/sts HTTP=http://localhost:" + std::to_string(waiting.GetPort()) + "/sts");
  EXPECT_LT(std::chrono::steady_clock::now() - start, PATIENCE);
  const std::string begin = "main: {Name: alice; Domain:corp.example}\nworker: CommunicationException: ";
  const std::string end = "\njoined\n";
  EXPECT_EQ(output.substr(0, begin.size()), begin);
  EXPECT_GT(output.size(), begin.size() + end.size());
  EXPECT_EQ(output.substr(output.size() - end.size()), end);
}

} // namespace
} // namespace Testing
