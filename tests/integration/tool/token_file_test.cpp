// SPDX-License-Identifier: Apache-2.0
// The file that a token is written to: it is written whole or not at all, and only its owner can read it.

#include "built_files.h"
#include "expect_result.h"
#include "service_test.h"
#include "terminal.h"

#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <set>
#include <string>

#include <sys/stat.h>

namespace ToolTest {
namespace {

class TokenFile : public ServiceTest {
protected:
  TokenFile() { m_before = m_folder.Names(); }

  std::string Line(const std::string &fault = {}) const {
    return "ssoclient acquire " + Service(fault) + PASSWORD + "--format xml --out token.xml ";
  }

  unsigned Mode(const std::string &name) const {
    struct stat status = {};
    stat((m_folder / name).c_str(), &status);
    return status.st_mode & 07777u;
  }

  bool IsToken(const std::string &name) const { return Run("ssoclient verify --trust sts.pem " + name).exitCode == 0; }

  std::set<std::string> WithToken() const {
    std::set<std::string> names = m_before;
    names.insert("token.xml");
    return names;
  }

  std::set<std::string> m_before;
};

TEST_F(TokenFile, IsReadableOnlyForItsOwnerWhateverTheMask) {
  EXPECT_EQ(0, Run("umask 000; " + Line()).exitCode);
  EXPECT_EQ(0600u, Mode("token.xml"));
  EXPECT_TRUE(IsToken("token.xml"));
  EXPECT_EQ(WithToken(), m_folder.Names());
}

TEST_F(TokenFile, IsNotReplacedWithoutForce) {
  m_folder.Write("token.xml", "what was there");
  ExpectResult(Run(Line()), 7, "", "ssoclient: file: token.xml: already exists; --force replaces it\n");
  EXPECT_EQ("what was there", m_folder.Read("token.xml"));
  EXPECT_EQ("", m_service.GetLog()); // the service received no request
}

TEST_F(TokenFile, IsReplacedWithForceAndThenReadableOnlyForItsOwner) {
  m_folder.Write("token.xml", std::string(1 << 20, 'x'));
  EXPECT_EQ(0, Run(Line() + "--force").exitCode);
  EXPECT_EQ(0600u, Mode("token.xml"));
  EXPECT_TRUE(IsToken("token.xml"));
  EXPECT_EQ(WithToken(), m_folder.Names());
}

TEST_F(TokenFile, ThatAppearsDuringTheRunIsNotReplacedWithoutForce) {
  TerminalSession session(
      ShellCommand("exec ssoclient acquire " + Service() + "--user alice@corp.example --format xml --out token.xml"),
      m_folder.Path());
  session.WaitFor("Password for alice@corp.example: "); // by then the tool has seen that there is no such file
  m_folder.Write("token.xml", "from another program");
  session.Type("wonderland\n");
  EXPECT_EQ(7, session.Finish());
  EXPECT_EQ("Password for alice@corp.example: \r\n"
            "ssoclient: file: token.xml: already exists; --force replaces it\r\n",
            session.Shown());
  EXPECT_NE(std::string::npos, m_service.GetLog().find(": issued")) << m_service.GetLog();
  EXPECT_EQ("from another program", m_folder.Read("token.xml"));
  EXPECT_EQ(WithToken(), m_folder.Names());
}

TEST_F(TokenFile, IsNotCreatedWhenItCannotBeWrittenWhole) {
  ExpectResult(Run("ulimit -f 1; " + Line()), 7, "", "ssoclient: file: token.xml: File too large\n");
  EXPECT_EQ(m_before, m_folder.Names());
}

TEST_F(TokenFile, IsKeptWithAWarningWhenStandardOutputFails) {
  const std::string line = "ssoclient acquire " + Service() + PASSWORD + "--out token.xml ";
  const std::string full =
      "token.xml was written, but what it says cannot be shown: standard output: No space left on device";
  const std::string closed =
      "token.xml was written, but what it says cannot be shown: standard output: Bad file descriptor";
  ExpectResult(Run(line + ">/dev/full"), 0, "", "ssoclient: warning: " + full + "\n");
  EXPECT_TRUE(IsToken("token.xml"));
  EXPECT_EQ(WithToken(), m_folder.Names());
  ExpectResult(Run(line + "--force >&-"), 0, "", "ssoclient: warning: " + closed + "\n");
  ExpectResult(Run(line + "--force --format json >/dev/full"), 0, "", "ssoclient: warning: " + full + "\n");
  EXPECT_TRUE(IsToken("token.xml"));
}

TEST_F(TokenFile, NeedsNoStandardOutputWhenTheFormatIsXml) {
  for (const char *closed : {"--force >/dev/full", "--force >&-"}) {
    ExpectResult(Run(Line() + closed), 0, "", "");
    EXPECT_TRUE(IsToken("token.xml"));
  }
}

TEST_F(TokenFile, IsNotCreatedWhenTheTokenIsForAStandardOutputThatFails) {
  for (const char *options : {"", "--out -", "--format xml", "--format json -v"}) {
    const Result result = Run("ssoclient acquire " + Service() + PASSWORD + options + " >/dev/full");
    EXPECT_EQ(7, result.exitCode) << options;
  }
  EXPECT_EQ(m_before, m_folder.Names());
}

TEST_F(TokenFile, StaysAsItWasWhenItCannotBeReplacedWhole) {
  m_folder.Write("token.xml", "what was there");
  EXPECT_EQ(7, Run("ulimit -f 1; " + Line() + "--force").exitCode);
  EXPECT_EQ("what was there", m_folder.Read("token.xml"));
  EXPECT_EQ(WithToken(), m_folder.Names());
}

TEST_F(TokenFile, IsWrittenWholeWhenASignalArrivesDuringTheWrite) {
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    const Result result = Run("SIGNAL_AT_FSYNC=" + std::to_string(signal) +
                              " ASAN_OPTIONS=verify_asan_link_order=0 LD_PRELOAD=" + InterruptingFsyncPath() +
                              " exec " + Line() + "--force");
    EXPECT_EQ(128 + signal, result.exitCode) << result.err;
    EXPECT_EQ(WithToken(), m_folder.Names());
    EXPECT_TRUE(IsToken("token.xml"));
    std::filesystem::remove(m_folder / "token.xml");
  }
}

TEST_F(TokenFile, IsNotCreatedWhenASecondSignalArrivesDuringTheWrite) {
  const Result result =
      Run("SIGNAL_AT_FSYNC=" + std::to_string(SIGINT) + " SECOND_SIGNAL_AT_FSYNC=" + std::to_string(SIGTERM) +
          " ASAN_OPTIONS=verify_asan_link_order=0 LD_PRELOAD=" + InterruptingFsyncPath() + " exec " + Line());
  EXPECT_EQ(130, result.exitCode);
  EXPECT_EQ(m_before, m_folder.Names());
}

TEST_F(TokenFile, IsNotCreatedWhenTheToolIsInterruptedWhileItWaitsForTheService) {
  TerminalSession session(ShellCommand("exec " + Line("stall")), m_folder.Path());
  AwaitLog("/sts/fault/stall: fault");
  session.Type("\x03"); // Ctrl-C
  EXPECT_EQ(130, session.Finish());
  EXPECT_EQ(m_before, m_folder.Names());
}

TEST_F(TokenFile, IsNotCreatedWhenTheToolIsTerminatedWhileItWaitsForTheService) {
  TerminalSession session(ShellCommand("exec " + Line("stall")), m_folder.Path());
  AwaitLog("/sts/fault/stall: fault");
  session.Signal(SIGTERM);
  EXPECT_EQ(128 + SIGTERM, session.Finish());
  EXPECT_EQ(m_before, m_folder.Names());
}

TEST_F(TokenFile, DoesNotReplaceALinkADeviceOrAFolder) {
  std::filesystem::create_symlink("elsewhere.xml", m_folder / "link.xml");
  std::filesystem::create_directory(m_folder / "folder");
  for (const char *file : {"link.xml", "folder", "/dev/null"}) {
    ExpectResult(Run("ssoclient acquire " + Service() + PASSWORD + "--force --out " + file), 7, "",
                 std::string("ssoclient: file: ") + file + ": is not a regular file\n");
  }
  EXPECT_EQ("", m_service.GetLog());
}

TEST_F(TokenFile, MayBeInAnotherFolder) {
  std::filesystem::create_directory(m_folder / "folder");
  EXPECT_EQ(0, Run("ssoclient acquire " + Service() + PASSWORD + "--out folder/token.xml").exitCode);
  EXPECT_EQ(0, Run("ssoclient acquire " + Service() + PASSWORD + "--out " + m_folder / "folder/other.xml").exitCode);
  EXPECT_TRUE(IsToken("folder/token.xml"));
  EXPECT_TRUE(IsToken("folder/other.xml"));
}

} // namespace
} // namespace ToolTest
