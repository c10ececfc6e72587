// SPDX-License-Identifier: Apache-2.0

#include "support/process_resources.h"
#include "unit/tarvel_ssl/tls_client.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <exception>
#include <thread>

namespace Tarvel::Ssl {
namespace {

using Testing::CreateTrustingContext;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsClient;

/// Ends the process during handshakes. The server uses no OpenSSL, so that only the clients' use of it is tested.
void EndWhileBusy() {
  auto *const server = new ScriptedServer([](ServerConnection &connection) {
    connection.ReadRawSome();
    connection.Reset();
  });
  const Ref<SSLContext> context = CreateTrustingContext();
  static std::atomic<int> attempts{0};
  for (int t = 0; t < 4; ++t) {
    std::thread([context, port = server->GetPort()] {
      for (;; ++attempts) {
        try {
          TlsClient(context, port).Handshake();
        } catch (const std::exception &) {
          // The server resets connections at any time.
        }
      }
    }).detach();
  }
  Testing::Eventually([] { return attempts > 20; });
  std::exit(0);
}

TEST(SSLStreamDeathTest, LetsTheProcessEndDuringHandshakes) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  for (int i = 0; i < 20; ++i) {
    ASSERT_EXIT(EndWhileBusy(), testing::ExitedWithCode(0), "") << i;
  }
}

} // namespace
} // namespace Tarvel::Ssl
