// SPDX-License-Identifier: Apache-2.0
// Use of the library by a static object of the host, before main.
#include "host_programs.h"

#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <gtest/gtest.h>

namespace Testing {
namespace {

std::string UrlOf(int port) {
  return "http://127.0.0.1:" + std::to_string(port) + "/sts";
}

TEST(StaticObjectBeforeAllOthers, VerifiesAndAcquiresTokensLikeMain) {
  const std::vector<std::string> answers(4, IssueResponse(ReadDataFile("tokens/bearer.xml")));
  const PostingServer plain(answers);
  const PostingServer secure(answers, TlsSettings());
  const UnusedPort refusing;
  const ScriptedServer resetting([](ServerConnection &peer) {
    peer.ReadRequest();
    peer.Reset();
  });
  const std::string refused =
      "Cannot connect to 127.0.0.1:" + std::to_string(refusing.GetPort()) + ": Connection refused\n";
  const std::string reset =
      "The connection to 127.0.0.1:" + std::to_string(resetting.GetPort()) + " broke: Connection reset by peer\n";
  std::string expected;
  for (const std::string time : {"early ", "main "}) {
    const std::string alice = "{Name: alice; Domain:corp.example}\n";
    for (const std::string token : {"bearer", "holder-of-key", "full", "delegated"}) {
      expected.append(time).append("tokens/" + token + ".xml: ").append(alice);
    }
    expected.append(time).append(
        "tokens/signed-by-other.xml: Failed to verify signature: token might have been tampered with.\n");
    for (int i = 0; i < 2; ++i) {
      expected.append(time).append("HTTP: ").append(alice);
    }
    for (int i = 0; i < 2; ++i) {
      expected.append(time).append("HTTPS: ").append(alice);
    }
    for (int i = 0; i < 2; ++i) {
      expected.append(time).append("REFUSING: ").append(refused);
    }
    for (int i = 0; i < 2; ++i) {
      expected.append(time).append("RESETTING: ").append(reset);
    }
  }
  EXPECT_EQ(RunHost(EARLY_HOST_PROGRAM, "HTTP=" + plain.GetUrl() + " HTTPS=" + secure.GetUrl() + " REFUSING=" +
                                            UrlOf(refusing.GetPort()) + " RESETTING=" + UrlOf(resetting.GetPort())),
            expected);
}

} // namespace
} // namespace Testing
