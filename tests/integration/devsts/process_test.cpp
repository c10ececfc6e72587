// SPDX-License-Identifier: Apache-2.0
// The service as a program: its start, its state folder, its users, its end.

#include "messages.h"

#include "support/json_object.h"
#include "support/work_folder.h"

#include <gmock/gmock.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <thread>

#include <sys/wait.h>

namespace DevStsTest {
namespace {

namespace fs = std::filesystem;
using Testing::DevSts;
using testing::HasSubstr;
using Testing::WorkFolder;

/// The message of a start that must fail.
std::string FailureOf(const std::vector<std::string> &arguments) {
  try {
    const DevSts service(arguments);
  } catch (const std::runtime_error &failure) {
    return failure.what();
  }
  return "started";
}

/// What the program writes to standard output, followed by its exit code.
std::string OutputOf(const std::string &arguments) {
  std::FILE *const stream = ::popen((DevSts::GetProgram() + (" " + arguments) + " </dev/null").c_str(), "r");
  std::string output;
  for (int octet = 0; (octet = std::fgetc(stream)) != EOF;) {
    output += static_cast<char>(octet);
  }
  return output + "exit code " + std::to_string(WEXITSTATUS(::pclose(stream)));
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

TEST(Process, EndsAtOnceEvenWhenConnectionsAreOpen) {
  DevSts service;
  TlsClient idle(service);
  TlsClient stalled(service);
  stalled.Send(PostBytes(SsoClient::Request::ISSUE, "", "/sts/fault/stall"));
  EXPECT_EQ(service.End(SIGTERM).exitCode, 0);
}

TEST(Process, ThatCrashesFailsTheTestsThatUseIt) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  const auto abortService = [] {
    const DevSts service;
    ::kill(service.GetProcess(), SIGABRT);
  };
  EXPECT_EXIT(abortService(), testing::ExitedWithCode(EXIT_FAILURE), "The development service has ended with 134\n");
}

TEST(Process, ReadyLineHasTheAddressAndTheFiles) {
  const DevSts service;
  const Testing::JsonObject ready = Testing::ReadJsonObject(service.GetReadyLine());
  EXPECT_EQ(ready.numbers.at("schema"), 1);
  EXPECT_EQ(ready.texts.at("url"), "https://localhost:" + std::to_string(service.GetPort()) + "/sts");
  EXPECT_EQ(ready.texts.at("echo"), "https://localhost:" + std::to_string(service.GetPort()) + "/echo");
  EXPECT_EQ(ready.numbers.at("port"), service.GetPort());
  EXPECT_EQ(ready.numbers.at("pid"), service.GetProcess());
  EXPECT_EQ(ready.texts.at("ca"), service.PathOf("authority.crt"));
  EXPECT_EQ(ready.texts.at("trust"), service.PathOf("signing.crt"));
  EXPECT_THAT(ready.texts.at("thumbprint"), testing::MatchesRegex("[0-9a-f]{64}"));
  EXPECT_TRUE(fs::path(ready.texts.at("ca")).is_absolute());
  EXPECT_EQ(ready.texts.size() + ready.numbers.size(), 8U);
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

TEST(State, IsOnlyForItsOwner) {
  const WorkFolder folder;
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
  const WorkFolder folder;
  std::string first;
  {
    const DevSts service({"--state", folder / "state"});
    first = service.ReadStateFile("signing.crt") + service.ReadStateFile("client.key");
  }
  const DevSts service({"--state", folder / "state"});
  EXPECT_EQ(service.ReadStateFile("signing.crt") + service.ReadStateFile("client.key"), first);
}

TEST(State, IsMadeOnceByStartsAtTheSameTime) {
  const WorkFolder folder;
  constexpr std::size_t STARTS = 4;
  std::vector<std::string> identities(STARTS);
  std::vector<std::thread> threads;
  for (std::size_t i = 0; i < STARTS; ++i) {
    threads.emplace_back([&, i] {
      const DevSts service({"--state", folder / "state"});
      identities[i] = IsIssued(Send(service, CertificateRequest(service)))
                          ? service.ReadStateFile("signing.crt") + service.ReadStateFile("client.key")
                          : "nothing issued";
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_THAT(identities[0], HasSubstr("-----BEGIN CERTIFICATE-----"));
  EXPECT_EQ(identities, std::vector<std::string>(STARTS, identities[0]));
}

TEST(State, IsRefusedWhenItsAuthorityHasChanged) {
  const WorkFolder folder;
  { const DevSts service({"--state", folder / "state"}); }
  fs::remove(folder / "state/authority.crt");
  EXPECT_EQ(FailureOf({"--state", folder / "state"}),
            "development service: ended with 1: ssoclient-devsts: " + (folder / "state/tls.crt") +
                ": was issued by another authority; remove the state folder to have it made anew\n");
}

TEST(State, IsNotMadeWhenTheRestOfTheCommandLineIsWrong) {
  const WorkFolder folder;
  FailureOf({"--state", folder / "state", "--users", folder / "missing"});
  EXPECT_EQ(folder.Names(), std::set<std::string>());
}

TEST(State, IsCompletedWhenAStartWasInterrupted) {
  const WorkFolder folder;
  { const DevSts service({"--state", folder / "state"}); }
  fs::remove(folder / "state/client.crt"); // the certificate is written last
  const DevSts service({"--state", folder / "state"});
  EXPECT_TRUE(IsIssued(Send(service, CertificateRequest(service))));
}

TEST(State, IsRefusedWhenAKeyDoesNotMatchItsCertificate) {
  const WorkFolder folder;
  { const DevSts service({"--state", folder / "state"}); }
  fs::copy_file(folder / "state/client.key", folder / "state/signing.key", fs::copy_options::overwrite_existing);
  EXPECT_EQ(FailureOf({"--state", folder / "state"}),
            "development service: ended with 1: ssoclient-devsts: " + (folder / "state/signing.crt") +
                ": does not match the key in the same folder\n");
}

TEST(State, IsRefusedWhenItIsNotAFolder) {
  const WorkFolder folder;
  const std::string file = folder.Write("file", "");
  EXPECT_EQ(FailureOf({"--state", file}),
            "development service: ended with 1: ssoclient-devsts: " + file + ": Not a directory\n");
}

TEST(UsersFile, ReplacesTheKnownUsers) {
  const WorkFolder folder;
  const std::string file = folder.Write("users.json", R"([{"name":"carol@other.example","password":"pass <&> word",
      "first":"Carol","last":"D","groups":["ops@other.example"]}])");
  const DevSts service({"--users", file});
  const HttpAnswer answer = Send(service, PasswordRequest("carol@other.example", "pass <&> word"));
  EXPECT_TRUE(IsIssued(answer));
  EXPECT_THAT(answer.body, HasSubstr("<saml:AttributeValue>other.example\\ops</saml:AttributeValue>"));
  EXPECT_TRUE(
      IsRefused(Send(service, PasswordRequest()), "wst:FailedAuthentication", "unknown user or wrong password"));
}

TEST(UsersFile, IsRefusedWhenItHasAnotherForm) {
  const WorkFolder folder;
  const auto refusal = [&folder](const std::string &content) {
    return FailureOf({"--users", folder.Write("users.json", content)});
  };
  const std::string begin = "development service: ended with 1: ssoclient-devsts: " + (folder / "users.json") + ": ";
  EXPECT_EQ(refusal("not JSON"), begin + "not JSON at byte 2\n");
  EXPECT_EQ(refusal(R"([{"name":"c@d","password":"secret" x)"), begin + "not JSON at byte 36\n"); // no password
  EXPECT_EQ(refusal("{}"), begin + "not an array of users\n");
  EXPECT_THAT(refusal(R"([{"name":"carol@other.example"}])"), HasSubstr("key 'password' not found"));
  EXPECT_EQ(refusal(R"([{"name":"carol","password":""}])"), begin + "'carol' is not of the form name@domain\n");
  EXPECT_EQ(refusal(R"([{"name":"c@d","password":""},{"name":"c@d","password":""}])"), begin + "'c@d' occurs twice\n");
  EXPECT_EQ(FailureOf({"--users", folder / "missing"}),
            "development service: ended with 1: ssoclient-devsts: " + (folder / "missing") + ": cannot be read\n");
}

TEST(CommandLine, IsRefusedWithOneLineAndExitCode2) {
  const struct {
    std::vector<std::string> arguments;
    const char *message;
  } cases[] = {
      {{"--fault", "no-such-fault"}, "--fault: unknown fault 'no-such-fault'; see --help"},
      {{"--tolerance", "-1"}, "--tolerance: Value -1 not in range 0 to 86400"},
      {{"--port", "65536"}, "Could not convert: --port = 65536"},
      {{"--charset", "EBCDIC"}, "--charset: EBCDIC not in {UTF-8,ISO-8859-1,windows-1252}"},
      {{"--no-such-option"}, "The following argument was not expected: --no-such-option"},
      {{"--state"}, "--state: 1 required TEXT missing"},
  };
  for (const auto &refused : cases) {
    EXPECT_EQ(FailureOf(refused.arguments),
              std::string("development service: ended with 2: ssoclient-devsts: ") + refused.message + "\n");
  }
  EXPECT_EQ(OutputOf("2>&1"), "ssoclient-devsts: --state is required\nexit code 2");
}

TEST(CommandLine, HelpShowsOptionsFaultsAndExamplesOnStandardOutput) {
  const std::string help = OutputOf("--help 2>&1");
  for (const char *part : {"Usage: ssoclient-devsts [OPTIONS]\n", "--until-eof ", "\nFaults:\n", " bad-status-NNN",
                           " soap-fault-FailedAuthentication", "\nExamples:\n  ssoclient-devsts --state "}) {
    EXPECT_THAT(help, HasSubstr(part));
  }
  EXPECT_THAT(help, testing::EndsWith("\nexit code 0"));
  EXPECT_THAT(OutputOf("--version"), testing::MatchesRegex("ssoclient-devsts [0-9.]+\nexit code 0"));
}

} // namespace
} // namespace DevStsTest
