// SPDX-License-Identifier: Apache-2.0
// Static objects that join threads, or start operations, after OpenSSL has cleaned itself up.
#include "integration/openssl_host/host_process.h"
#include "support/completion.h"
#include "support/scripted_server.h"

#include <gtest/gtest.h>

#include <future>
#include <string>
#include <vector>

namespace {

using Testing::HostProcess;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;

const std::string ENDED = "OpenSSL has cleaned itself up: the process is about to end\n";

/// Runs `step` against a server that does `first`, lets the host continue, and is silent after that.
std::string RunAgainstSilentServer(const char *step, const std::function<void(ServerConnection &)> &first) {
  std::promise<HostProcess *> started;
  const std::shared_future<HostProcess *> host = started.get_future().share();
  ScriptedServer server(
      [&first, host](ServerConnection &connection) {
        first(connection);
        host.get()->Continue();
        connection.WaitForInterrupt();
      },
      TlsSettings());
  HostProcess process(server.GetPort(), {step});
  started.set_value(&process);
  return process.Finish();
}

TEST(TheEndOfTheProcess, EndsARequestThatWaitsForItsAnswer) {
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(RunAgainstSilentServer("ask-service",
                                     [](ServerConnection &connection) {
                                       connection.Handshake();
                                       connection.ReadRequest();
                                     }),
              "worker: CommunicationException: " + ENDED);
  }
}

TEST(TheEndOfTheProcess, EndsAHandshakeThatWaitsForTheServer) {
  EXPECT_EQ(RunAgainstSilentServer("wait-in-handshake", [](ServerConnection &connection) { connection.ReadRawSome(); }),
            "handshake: InvalidStateException: " + ENDED);
}

TEST(TheEndOfTheProcess, EndsAReadThatWaitsForTheServer) {
  EXPECT_EQ(RunAgainstSilentServer("wait-in-read", [](ServerConnection &connection) { connection.Handshake(); }),
            "read: InvalidStateException: " + ENDED + "read again: InvalidStateException: " + ENDED);
}

TEST(TheEndOfTheProcess, RefusesNewOperations) {
  ScriptedServer server(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.WaitForInterrupt();
      },
      TlsSettings());
  std::string expected;
  for (const char *const what : {"read", "write", "handshake", "stream", "context", "trust", "request"}) {
    expected += std::string(what) + ": InvalidStateException: " + ENDED;
  }
  EXPECT_EQ(HostProcess(server.GetPort(), {"begin-at-end"}).Finish(), expected);
}

TEST(TheEndOfTheProcess, IsNotReportedAsARefusalOfAToken) {
  EXPECT_EQ(HostProcess(0, {"verify-at-end"}).Finish(),
            "verification: done\n"
            "verification: InvalidStateException: " +
                ENDED + "verification with a certificate: InvalidStateException: " + ENDED);
}

TEST(TheEndOfTheProcess, RefusesAFirstUse) {
  EXPECT_EQ(HostProcess(0, {"first-use-at-end"}).Finish(), "first use: InvalidStateException: " + ENDED);
}

} // namespace
