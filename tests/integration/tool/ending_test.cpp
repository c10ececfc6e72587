// SPDX-License-Identifier: Apache-2.0
// Each command ends at a signal and at the limit of --timeout, wherever it waits, and leaves no new file.

#include "expect_result.h"
#include "service_test.h"
#include "terminal.h"
#include "time_limit.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <set>
#include <string>
#include <tuple>

namespace ToolTest {
namespace {

using testing::HasSubstr;

constexpr const char *LATE = "ssoclient: timed out: the command did not end within 0.3 s, the limit of --timeout\n";

/// The commands that wait for the service, each with the options that it needs.
constexpr const char *SERVICE_COMMANDS[] = {
    "acquire --user alice@corp.example --password-file password.txt --out token.xml",
    "acquire --cert client.pem --key client.key --out token.xml",
    "acquire --cert client.pem --key client.key --token given.xml --out token.xml",
    "token --cache alice.cache --user alice@corp.example --password-file password.txt --out token.xml",
    "renew --cert client.pem --key client.key --out token.xml given.xml",
    "validate given.xml"};

/// The commands that wait for a file to which no process writes.
constexpr const char *FILE_COMMANDS[] = {"inspect fifo", "verify --trust sts.pem fifo",
                                         "verify --trust sts.pem --explain fifo", "verify --trust fifo given.xml"};

class Ending : public ServiceTest {
protected:
  Ending() {
    Acquire("given.xml", std::string(IDENTITY) + "--renewable");
    Run("mkfifo fifo");
    m_before = m_folder.Names();
  }

  /// The command line with the service that never answers.
  std::string Stalled(const std::string &command) const { return "ssoclient " + command + " " + Service("stall"); }

  /// Expects no new file, except an empty cache if the command has one: it may have ended before it made the cache.
  void ExpectNothingLeft(const std::string &command) const {
    std::set<std::string> names = m_folder.Names();
    if (command.find("--cache") != std::string::npos && names.erase("alice.cache") > 0) {
      EXPECT_EQ("", m_folder.Read("alice.cache"));
    }
    EXPECT_EQ(m_before, names);
  }

  std::set<std::string> m_before;
};

class OfServiceCommand : public Ending, public testing::WithParamInterface<std::tuple<const char *, int>> {};

TEST_P(OfServiceCommand, IsCausedByASignalWhileTheServiceDoesNotAnswer) {
  const auto [command, signal] = GetParam();
  TerminalSession session(ShellCommand("exec " + Stalled(command)), m_folder.Path());
  AwaitLog("/sts/fault/stall: fault");
  session.Signal(signal);
  EXPECT_EQ(128 + signal, session.Finish());
  EXPECT_EQ("", session.Shown());
  ExpectNothingLeft(command);
}

INSTANTIATE_TEST_SUITE_P(Each, OfServiceCommand,
                         testing::Combine(testing::ValuesIn(SERVICE_COMMANDS), testing::Values(SIGINT, SIGTERM)));

class LateServiceCommand : public Ending, public testing::WithParamInterface<const char *> {};

TEST_P(LateServiceCommand, EndsInTime) {
  ExpectResult(Run(Stalled(GetParam()) + "--timeout 0.3"), 4, "", LATE);
  ExpectNothingLeft(GetParam());
}

TEST_P(LateServiceCommand, EndsInTimeWithAnObjectInJson) {
  ExpectResult(Run(Stalled(GetParam()) + "--timeout 0.3 --format json"), 4, "",
               R"({"schema":1,"error":{"class":"DeadlineExceededException","message":)"
               R"("the command did not end within 0.3 s, the limit of --timeout"}})"
               "\n");
}

INSTANTIATE_TEST_SUITE_P(Each, LateServiceCommand, testing::ValuesIn(SERVICE_COMMANDS));

class LateFileCommand : public Ending, public testing::WithParamInterface<const char *> {};

TEST_P(LateFileCommand, EndsInTime) {
  ExpectResult(Run(std::string("ssoclient ") + GetParam() + " --timeout 0.3"), 4, "", LATE);
}

TEST_P(LateFileCommand, EndsAtASignal) {
  for (const int signal : {SIGINT, SIGTERM}) {
    TerminalSession session(ShellCommand("exec ssoclient " + std::string(GetParam())), m_folder.Path());
    session.WaitUntilItBlocks(signal);
    session.Signal(signal);
    EXPECT_EQ(128 + signal, session.Finish());
    EXPECT_EQ("", session.Shown());
  }
}

INSTANTIATE_TEST_SUITE_P(Each, LateFileCommand, testing::ValuesIn(FILE_COMMANDS));

/// A run that ended at the prompt.
struct EndAtPrompt {
  std::string seconds; ///< the limit of --timeout
  bool wasQuiet;       ///< while the tool waited for the password
  bool echoesAgain;
  int exitCode;
  std::string shown;
};

TEST_F(Ending, IsInTimeAtThePromptAndTheTerminalEchoesAgain) {
  const std::string prompt = "Password for alice@corp.example: ";
  for (const char *command : {"acquire ", "token --cache alice.cache "}) {
    const EndAtPrompt end = RunWithEnoughTime(
        [&](const std::string &seconds) {
          TerminalSession session(ShellCommand("exec ssoclient " + (command + Service()) +
                                               "--user alice@corp.example --timeout " + seconds),
                                  m_folder.Path());
          session.WaitFor(": ");
          const bool wasQuiet = !session.Echoes();
          const int exitCode = session.Finish();
          return EndAtPrompt{seconds, wasQuiet, session.Echoes(), exitCode, session.Shown()};
        },
        [&](const EndAtPrompt &reached) { return reached.wasQuiet && reached.shown.find(prompt) == 0; });
    EXPECT_TRUE(end.wasQuiet);
    EXPECT_TRUE(end.echoesAgain);
    EXPECT_EQ(4, end.exitCode);
    EXPECT_EQ(prompt + "ssoclient: timed out: the command did not end within " + end.seconds +
                  " s, the limit of --timeout\r\n",
              end.shown);
  }
}

TEST_F(Ending, OfTheDoctorIsInTimeAndItReportsWhatItHasFound) {
  const Result result = RunWithEnoughTime(
      [&](const std::string &seconds) { return Run("ssoclient doctor " + Service("stall") + "--timeout " + seconds); },
      [](const Result &run) {
        return run.err.empty() && run.out.find("\nhttp          failed    ") != std::string::npos;
      });
  EXPECT_EQ(4, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(result.out, HasSubstr("\nhttp          failed    "));
  EXPECT_THAT(result.out, HasSubstr("\ncertificates  fine      "));
}

TEST_F(Ending, OfTheDoctorIsInTimeWhileItReadsAFile) {
  ExpectResult(Run("ssoclient doctor --sts https://127.0.0.1:9/ --ca fifo --timeout 0.3"), 4, "", LATE);
}

TEST_F(Ending, IsNotCausedByASignalThatIsIgnored) {
  TerminalSession session(ShellCommand("trap '' INT; exec ssoclient inspect fifo"), m_folder.Path());
  session.WaitUntilItBlocks(SIGTERM);
  session.Signal(SIGINT); // which would be received first
  session.Signal(SIGTERM);
  EXPECT_EQ(128 + SIGTERM, session.Finish());
}

TEST_F(Ending, AtATimeOutOfRangeIsRefused) {
  for (const char *timeout : {"0", "0.0009", "86400.001", "1e3", "-1", "5.", ".5", "1 ", "99999999999999999999"}) {
    ExpectResult(
        Run("ssoclient inspect --timeout '" + std::string(timeout) + "' given.xml"), 2, "",
        "ssoclient: usage: --timeout: must be a number of seconds from 0.001 to 86400; see ssoclient --help\n");
  }
}

TEST_F(Ending, IsUnchangedForACommandThatNeedsLessTime) {
  for (const char *timeout : {"60", "60.5", "86400"}) {
    ExpectResult(Run("ssoclient validate --timeout " + std::string(timeout) + " " + Service() + "given.xml"), 0,
                 "valid\n", "");
  }
}

} // namespace
} // namespace ToolTest
