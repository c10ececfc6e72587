// SPDX-License-Identifier: Apache-2.0
// `ssoclient token`: a token from a file that several runs share.

#include "built_files.h"
#include "expect_result.h"
#include "service_test.h"
#include "terminal.h"

#include "support/sanitized.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <set>
#include <string>

#include <sys/stat.h>

namespace ToolTest {
namespace {

using testing::HasSubstr;
using testing::StartsWith;

constexpr const char *USER = "--user alice@corp.example ";

class Token : public ServiceTest {
protected:
  Token() { m_before = m_folder.Names(); }

  std::string Line(const std::string &options = PASSWORD, const std::string &fault = {}) const {
    return "ssoclient token --cache alice.cache " + Service(fault) + options + " ";
  }

  /// How many tokens the service has issued.
  int CountIssued() const {
    const std::string log = m_service.GetLog();
    int count = 0;
    for (std::size_t at = log.find(" issued"); at != std::string::npos; at = log.find(" issued", at + 1)) {
      ++count;
    }
    return count;
  }

  /// Runs a command line that must print a token, and returns the token.
  std::string Print(const std::string &line) const {
    const Result result = Run(line);
    EXPECT_EQ(0, result.exitCode);
    EXPECT_EQ("", result.err);
    EXPECT_THAT(result.out, StartsWith("<saml:Assertion "));
    return result.out;
  }

  void ExpectCacheRefused(const std::string &reason) const {
    ExpectResult(Run(Line()), 7, "", "ssoclient: file: Cannot use alice.cache: " + reason + "\n");
    EXPECT_EQ("", m_service.GetLog());
  }

  std::set<std::string> WithCache() const {
    std::set<std::string> names = m_before;
    names.insert("alice.cache");
    return names;
  }

  std::set<std::string> m_before;
};

TEST_F(Token, IsPrintedAgainWithoutARequest) {
  const std::string token = Print(Line());
  EXPECT_EQ(token, Print(Line()));
  EXPECT_EQ(1, CountIssued());
  m_folder.Write("token.xml", token);
  EXPECT_EQ(0, Run("ssoclient verify --trust sts.pem token.xml").exitCode);
}

TEST_F(Token, IsKeptInAFileForItsOwnerOnlyAndNoOtherFileIsLeft) {
  Print("umask 000; " + Line());
  struct stat status = {};
  stat((m_folder / "alice.cache").c_str(), &status);
  EXPECT_EQ(0600u, status.st_mode & 07777u);
  EXPECT_EQ(WithCache(), m_folder.Names());
}

TEST_F(Token, NeedsNoPasswordWhileItIsFresh) {
  const std::string token = Print(Line());
  EXPECT_EQ(token, Print(Line(std::string(USER) + "--password-file missing.txt")));
  EXPECT_EQ(token, Print("setsid -w " + Line(USER)));
}

TEST_F(Token, IsAcquiredWithAPasswordFromAPrompt) {
  TerminalSession session(ShellCommand("exec " + Line(std::string(USER) + "--out alice.xml")), m_folder.Path());
  session.WaitFor("Password for alice@corp.example: ");
  EXPECT_FALSE(session.Echoes());
  session.Type("wonderland\n");
  EXPECT_EQ(0, session.Finish());
  EXPECT_EQ("Password for alice@corp.example: \r\n", session.Shown());
  EXPECT_EQ(m_folder.Read("alice.xml"), Print("setsid -w " + Line(USER)));
}

TEST_F(Token, ThatIsInterruptedAtThePromptLeavesOnlyAnEmptyCache) {
  TerminalSession session(ShellCommand("exec " + Line(USER)), m_folder.Path());
  session.WaitFor("Password for alice@corp.example: ");
  session.Type("\x03"); // Ctrl-C
  EXPECT_EQ(130, session.Finish());
  EXPECT_TRUE(session.Echoes());
  EXPECT_EQ(WithCache(), m_folder.Names());
  EXPECT_EQ("", m_folder.Read("alice.cache"));
}

TEST_F(Token, IsReplacedOnDemand) {
  const std::string first = Print(Line());
  const std::string second = Print(Line() + "--refresh");
  EXPECT_NE(first, second);
  EXPECT_EQ(second, Print(Line()));
  EXPECT_EQ(2, CountIssued());
}

TEST_F(Token, IsAcquiredOnceByARefreshOfAnEmptyCache) {
  Print(Line() + "--refresh");
  EXPECT_EQ(1, CountIssued());
}

TEST_F(Token, IsRequestedOnceByManyRunsAtTheSameTime) {
  const Result result = Run(
      "for i in 01 02 03 04 05 06 07 08 09 10 11 12 13 14 15 16 17 18 19 20; do " + Line() +
      ">token$i.xml & done; wait; for t in token*.xml; do sha256sum <$t; done | uniq | wc -l; ls token*.xml | wc -l");
  ExpectResult(result, 0, "1\n20\n", "");
  EXPECT_EQ(1, CountIssued());
}

TEST_F(Token, IsRequestedOnceByAScriptThatAsksRepeatedly) {
  const std::string count = Testing::IS_SANITIZED ? "20" : "200";
  const Result result =
      Run("i=0; while [ $i -lt " + count + " ]; do " + Line() +
          ">token$i.xml || exit; i=$((i + 1)); done; for t in token*.xml; do sha256sum <$t; done | uniq | wc -l");
  ExpectResult(result, 0, "1\n", "");
  EXPECT_EQ(1, CountIssued());
}

TEST_F(Token, IsNotThatOfAnotherUserOrKeyOrRequest) {
  const std::string token = Print(Line());
  for (const std::string &options : {std::string(PASSWORD) + "--delegable", std::string(PASSWORD) + IDENTITY,
                                     std::string(PASSWORD) + OTHER_IDENTITY, std::string(IDENTITY)}) {
    EXPECT_NE(token, Print(Line(options))) << options;
  }
  EXPECT_EQ(5, CountIssued());
}

TEST_F(Token, IsExchangedForAnother) {
  Acquire("given.xml", IDENTITY);
  const std::string line = Line(std::string(IDENTITY) + "--token given.xml");
  EXPECT_EQ(Print(line), Print(line));
  EXPECT_EQ(2, CountIssued());
}

TEST_F(Token, InExchangeForAnotherTokenOfTheSameSubjectIsAnotherOne) {
  Acquire("given.xml", IDENTITY);
  Acquire("other.xml", IDENTITY);
  const std::string token = Print(Line(std::string(IDENTITY) + "--token given.xml"));
  EXPECT_NE(token, Print(Line(std::string(IDENTITY) + "--token other.xml")));
  EXPECT_EQ(4, CountIssued());
}

TEST_F(Token, IsShownInEachFormat) {
  const std::string token = Print(Line());
  EXPECT_THAT(Run(Line() + "--format text").out, StartsWith("Verified:        yes\n"));
  EXPECT_THAT(Run(Line() + "--format json").out, StartsWith("{\n  \"schema\": 1,\n  \"verified\": true,\n"));
  ExpectResult(Run(Line() + "--out token.xml"), 0, "", "");
  EXPECT_EQ(token, m_folder.Read("token.xml"));
}

TEST_F(Token, IsAcquiredAgainIfTheCachedOneIsOutsideTheTolerance) {
  Print(Line(std::string(PASSWORD) + "--lifetime 1h"));
  const Result result = Run(Line(std::string(PASSWORD) + "--lifetime 1h --tolerance -3600"));
  EXPECT_EQ(5, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_EQ(2, CountIssued());
}

TEST_F(Token, NeedsACache) {
  ExpectResult(
      Run("ssoclient token " + Service() + PASSWORD), 2, "",
      "ssoclient: usage: token needs --cache FILE, in which it keeps the token; acquire gets a token without a "
      "cache\n");
}

TEST_F(Token, OfATicketNeedsThePrincipal) {
  ExpectResult(Run(Line("--gss")), 2, "",
               "ssoclient: usage: with --cache, --gss needs --principal: the cache must know whose token it has\n");
}

TEST_F(Token, IsNotKeptInALinkOrAFolderOrAFileThatOthersMayRead) {
  std::filesystem::create_symlink("password.txt", m_folder / "alice.cache");
  ExpectCacheRefused("it is a symbolic link");
  std::filesystem::remove(m_folder / "alice.cache");
  m_folder.Write("alice.cache", "");
  chmod((m_folder / "alice.cache").c_str(), 0644);
  ExpectCacheRefused("its mode lets other users read or write it; it must be 0600");
  std::filesystem::remove(m_folder / "alice.cache");
  std::filesystem::create_directory(m_folder / "alice.cache");
  ExpectCacheRefused("it is not a regular file");
}

TEST_F(Token, IsNotKeptInAMissingFolder) {
  ExpectResult(Run("ssoclient token --cache missing/alice.cache " + Service() + PASSWORD), 7, "",
               "ssoclient: file: Cannot create missing/alice.cache: No such file or directory\n");
}

TEST_F(Token, IsPrintedWithAWarningWhenItCannotBeKept) {
  const Result result = Run("ulimit -f 1; " + Line());
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("ssoclient: warning: the token could not be written to alice.cache; -v shows why\n", result.err);
  EXPECT_THAT(result.out, StartsWith("<saml:Assertion "));
  EXPECT_EQ(WithCache(), m_folder.Names());
  EXPECT_THAT(Run("ulimit -f 1; " + Line() + "-v").err,
              HasSubstr("ssoclient: log: The token was not written to the cache: Cannot write alice.cache: File too "
                        "large\n"));
}

TEST_F(Token, ReplacesACacheThatIsDamaged) {
  const std::string token = Print(Line());
  const std::string whole = m_folder.Read("alice.cache");
  for (const std::string &content :
       {whole.substr(0, whole.size() / 2), std::string("ssoclient token cache 2\n"), std::string()}) {
    m_folder.Write("alice.cache", content);
    EXPECT_NE(token, Print(Line()));
  }
  EXPECT_EQ(4, CountIssued());
}

TEST_F(Token, IsNotKeptInAFileOfAnotherKind) {
  std::filesystem::copy_file(m_folder / "client.key", m_folder / "alice.cache");
  chmod((m_folder / "alice.cache").c_str(), 0600);
  ExpectCacheRefused("it is not a token cache");
  EXPECT_EQ(m_folder.Read("client.key"), m_folder.Read("alice.cache"));
}

TEST_F(Token, ReportsWhyTheServiceRefusesIt) {
  ExpectResult(Run(Line(std::string(USER) + "--password-file wrong.txt")), 3, "",
               Run("ssoclient acquire " + Service() + USER + "--password-file wrong.txt").err);
}

TEST_F(Token, IsRefusedWithAHintLikeThatOfAcquire) {
  const std::string options = std::string(PASSWORD) + IDENTITY + "--delegate-to bob@corp.example";
  const Result acquired = Run("ssoclient acquire " + Service() + options);
  ExpectResult(Run(Line(options)), acquired.exitCode, "", acquired.err);
  EXPECT_THAT(acquired.err, HasSubstr("ssoclient: hint: also give --bearer"));
}

TEST_F(Token, OfAWrongSignerIsSavedLikeThatOfAcquire) {
  const Result result = Run(Line(std::string(PASSWORD) + "--save-refused refused.xml", "wrong-signer"));
  EXPECT_EQ(6, result.exitCode);
  EXPECT_THAT(result.err, HasSubstr("ssoclient: hint: the refused token is in refused.xml"));
  EXPECT_EQ(1u, m_folder.Names().count("refused.xml"));
}

TEST_F(Token, LeavesNoUnfinishedCacheWhenASignalArrivesDuringTheWrite) {
  const Result result =
      Run("SIGNAL_AT_FSYNC=" + std::to_string(SIGINT) +
          " ASAN_OPTIONS=verify_asan_link_order=0 LD_PRELOAD=" + InterruptingFsyncPath() + " exec " + Line());
  EXPECT_EQ(130, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_EQ(WithCache(), m_folder.Names());
  Print(Line());
  EXPECT_EQ(WithCache(), m_folder.Names());
}

} // namespace
} // namespace ToolTest
