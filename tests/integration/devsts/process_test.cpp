// SPDX-License-Identifier: Apache-2.0
// The service as a program: its start, its state folder, its users, its end.

#include "messages.h"

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include <csignal>
#include <filesystem>
#include <fstream>

#include <stdlib.h>

namespace DevStsTest {
namespace {

namespace fs = std::filesystem;
using Testing::DevSts;
using testing::HasSubstr;

/// A folder of its own, removed with all that is in it.
class TemporaryFolder {
public:
  TemporaryFolder() {
    std::string pattern = (fs::temp_directory_path() / "devsts-XXXXXX").string();
    if (!mkdtemp(pattern.data())) {
      throw std::runtime_error("no temporary folder");
    }
    m_path = pattern;
  }
  TemporaryFolder(const TemporaryFolder &) = delete;
  TemporaryFolder &operator=(const TemporaryFolder &) = delete;
  ~TemporaryFolder() {
    std::error_code ignored;
    fs::remove_all(m_path, ignored);
  }
  std::string operator/(const char *name) const { return (m_path / name).string(); }
  std::string Write(const char *name, const std::string &content) const {
    std::ofstream(m_path / name) << content;
    return *this / name;
  }

private:
  fs::path m_path;
};

/// What a start that must fail says.
std::string FailureOf(const std::vector<std::string> &arguments) {
  try {
    const DevSts service(arguments);
  } catch (const std::runtime_error &failure) {
    return failure.what();
  }
  return "started";
}

TEST(Process, EndsAtSigtermWithZero) {
  DevSts service;
  const Testing::ProcessEnd end = service.End(SIGTERM);
  EXPECT_EQ(end.exitCode, 0);
  EXPECT_EQ(end.out, "");
}

TEST(Process, EndsAtSigintWithZero) {
  DevSts service;
  EXPECT_EQ(service.End(SIGINT).exitCode, 0);
}

TEST(Process, EndsWhenItsStandardInputEnds) {
  DevSts service;
  EXPECT_EQ(service.End().exitCode, 0);
}

TEST(Process, EndsAtOnceThoughConnectionsAreOpen) {
  DevSts service;
  TlsClient idle(service);
  TlsClient stalled(service);
  stalled.Send(PostBytes(SsoClient::Request::ISSUE, "", "/sts/fault/stall"));
  EXPECT_EQ(service.End(SIGTERM).exitCode, 0);
}

TEST(Process, ReadyLineTellsAddressAndFiles) {
  const DevSts service;
  const nlohmann::json ready = nlohmann::json::parse(service.GetReadyLine());
  EXPECT_EQ(ready.at("schema"), 1);
  EXPECT_EQ(ready.at("url"), "https://localhost:" + std::to_string(service.GetPort()) + "/sts");
  EXPECT_EQ(ready.at("port"), service.GetPort());
  EXPECT_EQ(ready.at("pid"), service.GetProcess());
  EXPECT_EQ(ready.at("ca"), service.PathOf("authority.crt"));
  EXPECT_EQ(ready.at("trust"), service.PathOf("signing.crt"));
  EXPECT_THAT(ready.at("thumbprint").get<std::string>(), testing::MatchesRegex("[0-9a-f]{64}"));
  EXPECT_TRUE(fs::path(ready.at("ca").get<std::string>()).is_absolute());
  EXPECT_EQ(ready.size(), 7U);
}

TEST(Process, ListensOnBothLoopbackAddresses) {
  const DevSts service;
  for (const bool v6 : {false, true}) {
    TlsClient client(service, v6);
    const SsoClient::Request request = PasswordRequest();
    client.Send(PostBytes(request.soapAction, request.body));
    EXPECT_TRUE(IsIssued(client.Receive())) << v6;
  }
}

TEST(Process, RefusesAPortThatIsTaken) {
  const DevSts service;
  EXPECT_THAT(FailureOf({"--port", std::to_string(service.GetPort())}), HasSubstr("Address already in use"));
}

TEST(State, IsForItsOwnerAlone) {
  const TemporaryFolder folder;
  const DevSts service({"--state", folder / "state"});
  EXPECT_EQ(fs::status(folder / "state").permissions(), fs::perms::owner_all);
  int keys = 0;
  for (const fs::directory_entry &entry : fs::directory_iterator(folder / "state")) {
    if (entry.path().extension() == ".key") {
      ++keys;
      EXPECT_EQ(entry.status().permissions(), fs::perms::owner_read | fs::perms::owner_write) << entry.path();
    }
  }
  EXPECT_EQ(keys, 6);
}

TEST(State, IsUsedAgain) {
  const TemporaryFolder folder;
  std::string first;
  {
    const DevSts service({"--state", folder / "state"});
    first = service.ReadStateFile("signing.crt") + service.ReadStateFile("client.key");
  }
  const DevSts service({"--state", folder / "state"});
  EXPECT_EQ(service.ReadStateFile("signing.crt") + service.ReadStateFile("client.key"), first);
}

TEST(State, IsCompletedWhenAStartWasInterrupted) {
  const TemporaryFolder folder;
  { const DevSts service({"--state", folder / "state"}); }
  fs::remove(folder / "state/client.crt"); // the certificate is written last
  const DevSts service({"--state", folder / "state"});
  EXPECT_TRUE(IsIssued(Send(service, CertificateRequest(service))));
}

TEST(State, IsRefusedWhenAKeyDoesNotFit) {
  const TemporaryFolder folder;
  { const DevSts service({"--state", folder / "state"}); }
  fs::copy_file(folder / "state/client.key", folder / "state/signing.key", fs::copy_options::overwrite_existing);
  EXPECT_EQ(FailureOf({"--state", folder / "state"}),
            "development service: ended: ssoclient-devsts: " + (folder / "state/signing.crt") +
                ": does not belong to the key beside it\n");
}

TEST(State, IsRefusedWhenItIsNoFolder) {
  const TemporaryFolder folder;
  const std::string file = folder.Write("file", "");
  EXPECT_EQ(FailureOf({"--state", file}),
            "development service: ended: ssoclient-devsts: " + file + ": Not a directory\n");
}

TEST(UsersFile, ReplacesTheKnownUsers) {
  const TemporaryFolder folder;
  const std::string file = folder.Write("users.json", R"([{"name":"carol@other.example","password":"pass <&> word",
      "first":"Carol","last":"D","groups":["ops@other.example"]}])");
  const DevSts service({"--users", file});
  const HttpAnswer answer = Send(service, PasswordRequest("carol@other.example", "pass <&> word"));
  EXPECT_TRUE(IsIssued(answer));
  EXPECT_THAT(answer.body, HasSubstr("<saml:AttributeValue>other.example\\ops</saml:AttributeValue>"));
  EXPECT_TRUE(
      IsRefused(Send(service, PasswordRequest()), "wst:FailedAuthentication", "unknown user or wrong password"));
}

TEST(UsersFile, IsRefusedWhenItIsOfAnotherForm) {
  const TemporaryFolder folder;
  const auto refusal = [&folder](const std::string &content) {
    return FailureOf({"--users", folder.Write("users.json", content)});
  };
  const std::string begin = "development service: ended: ssoclient-devsts: " + (folder / "users.json") + ": ";
  EXPECT_THAT(refusal("not JSON"), HasSubstr(begin));
  EXPECT_EQ(refusal("{}"), begin + "not an array of users\n");
  EXPECT_THAT(refusal(R"([{"name":"carol@other.example"}])"), HasSubstr("key 'password' not found"));
  EXPECT_EQ(refusal(R"([{"name":"carol","password":""}])"), begin + "'carol' is not of the form name@domain\n");
  EXPECT_EQ(refusal(R"([{"name":"c@d","password":""},{"name":"c@d","password":""}])"), begin + "'c@d' stands twice\n");
  EXPECT_EQ(FailureOf({"--users", folder / "missing"}),
            "development service: ended: ssoclient-devsts: " + (folder / "missing") + ": cannot be read\n");
}

TEST(CommandLine, UnknownFaultIsRefused) {
  EXPECT_EQ(FailureOf({"--fault", "no-such-fault"}),
            "development service: ended: ssoclient-devsts: --fault: no fault is named 'no-such-fault'; see --help\n");
}

TEST(CommandLine, ToleranceOutOfRangeIsRefused) {
  EXPECT_THAT(FailureOf({"--tolerance", "-1"}), HasSubstr("ssoclient-devsts: --tolerance: "));
}

} // namespace
} // namespace DevStsTest
