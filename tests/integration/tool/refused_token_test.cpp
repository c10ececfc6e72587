// SPDX-License-Identifier: Apache-2.0
// --save-refused keeps a token that the service issues and the tool refuses.

#include "expect_result.h"
#include "refusals.h"
#include "service_test.h"
#include "terminal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

namespace ToolTest {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr const char *TAMPERED = "Failed to verify signature: token might have been tampered with.";
constexpr const char *PLACE = "the refused token is in refused.xml, which is secret: it may be valid elsewhere";

std::string SavedHint() {
  return std::string(PLACE) + "; ssoclient verify --explain shows each check of it";
}

class SaveRefused : public ServiceTest {
protected:
  std::string Line(const std::string &fault = "wrong-signer") const {
    return "ssoclient acquire " + Service(fault) + PASSWORD + "--save-refused refused.xml ";
  }

  std::filesystem::perms ModeOf(const std::string &file) const {
    return std::filesystem::status(m_folder / file).permissions();
  }
};

constexpr auto OWNER_ALONE = std::filesystem::perms::owner_read | std::filesystem::perms::owner_write;

TEST_F(SaveRefused, KeepsTheTokenForItsOwnerOnly) {
  const Result result = Run("umask 0; " + Line());
  ExpectResult(result, 6, "",
               std::string("ssoclient: ") + PLACE + "\n" + RefusalText("signature invalid", TAMPERED, SavedHint()));
  EXPECT_THAT(m_folder.Read("refused.xml"), HasSubstr(":Assertion "));
  EXPECT_EQ(OWNER_ALONE, ModeOf("refused.xml"));
}

TEST_F(SaveRefused, WritesOnlyTheFailureInJson) {
  ExpectResult(Run(Line() + "--format json"), 6, "", RefusalJson("InvalidSignatureException", TAMPERED, SavedHint()));
  EXPECT_EQ(1u, m_folder.Names().count("refused.xml"));
}

TEST_F(SaveRefused, KeepsATokenThatVerifyExplains) {
  EXPECT_EQ(6, Run(Line()).exitCode);
  const Result result = Run("ssoclient verify --explain --trust sts.pem refused.xml");
  EXPECT_EQ(6, result.exitCode);
  EXPECT_THAT(result.out, HasSubstr("\nsignature              failed "));
  EXPECT_THAT(result.out, HasSubstr("\ndigests                passed "));
  EXPECT_EQ(0, Run("ssoclient inspect refused.xml").exitCode);
}

TEST_F(SaveRefused, KeepsATokenThatIsRefusedForItsForm) {
  for (const char *fault : {"expired-token", "unsigned-token", "unknown-element"}) {
    const Result result = Run(Line(fault) + "--force");
    EXPECT_EQ(8, result.exitCode) << fault;
    EXPECT_THAT(result.err, HasSubstr("\nssoclient: hint: ")) << fault;
    EXPECT_THAT(result.err, EndsWith(SavedHint() + "\n")) << fault;
    EXPECT_THAT(m_folder.Read("refused.xml"), HasSubstr("Assertion")) << fault;
    std::filesystem::remove(m_folder / "refused.xml");
  }
}

TEST_F(SaveRefused, KeepsATokenThatANarrowerToleranceRefuses) {
  const Result result = Run(Line("plain-token") + "--lifetime 1h --tolerance -3600");
  EXPECT_EQ(5, result.exitCode);
  EXPECT_THAT(result.err, HasSubstr("ssoclient: hint: " + SavedHint()));
  EXPECT_THAT(m_folder.Read("refused.xml"), HasSubstr(":Assertion "));
}

TEST_F(SaveRefused, KeepsTheTokenOfARefusedRenewal) {
  Acquire("token.xml", std::string(IDENTITY) + "--renewable");
  ExpectResult(Run("ssoclient renew " + Service("wrong-signer") + IDENTITY + "--save-refused refused.xml token.xml"), 6,
               "", std::string("ssoclient: ") + PLACE + "\n" + RefusalText("signature invalid", TAMPERED, SavedHint()));
  EXPECT_EQ(OWNER_ALONE, ModeOf("refused.xml"));
}

TEST_F(SaveRefused, DoesNotReplaceAFileWithoutForce) {
  m_folder.Write("refused.xml", "what was there");
  ExpectResult(Run(Line()), 7, "", "ssoclient: file: refused.xml: already exists; --force replaces it\n");
  EXPECT_EQ("what was there", m_folder.Read("refused.xml"));
  EXPECT_EQ("", m_service.GetLog());
  EXPECT_EQ(6, Run(Line() + "--force").exitCode);
  EXPECT_THAT(m_folder.Read("refused.xml"), HasSubstr(":Assertion "));
}

TEST_F(SaveRefused, DoesNotReplaceAFileThatAppearsDuringTheRun) {
  TerminalSession session(ShellCommand("exec ssoclient acquire " + Service("wrong-signer") +
                                       "--user alice@corp.example --save-refused refused.xml"),
                          m_folder.Path());
  session.WaitFor("Password for alice@corp.example: "); // by then the tool has seen that there is no such file
  m_folder.Write("refused.xml", "from another program");
  session.Type("wonderland\n");
  EXPECT_EQ(6, session.Finish());
  EXPECT_THAT(session.Shown(), HasSubstr("ssoclient: warning: the refused token could not be saved: refused.xml: "
                                         "already exists; --force replaces it\r\n"));
  EXPECT_EQ("from another program", m_folder.Read("refused.xml"));
}

TEST_F(SaveRefused, WritesNoFileWhenNoTokenIsRefused) {
  EXPECT_EQ(0, Run(Line("plain-token")).exitCode);
  const Result refused = Run("ssoclient acquire " + Service() +
                             "--user alice@corp.example --password-file wrong.txt --save-refused refused.xml");
  EXPECT_EQ(3, refused.exitCode);
  EXPECT_THAT(refused.err, Not(HasSubstr("hint")));
  EXPECT_EQ(0u, m_folder.Names().count("refused.xml"));
}

TEST_F(SaveRefused, WarnsWhenTheFileCannotBeWritten) {
  // A limit on file sizes has the same effect as a full disk. The signal that reports the limit is ignored.
  const std::string limited = "trap '' XFSZ; ulimit -f 0; " + Line();
  const std::string problem = "the refused token could not be saved: refused.xml: File too large";
  ExpectResult(Run(limited), 6, "",
               "ssoclient: warning: " + problem + "\n" + RefusalText("signature invalid", TAMPERED, problem));
  ExpectResult(Run(limited + "--format json"), 6, "", RefusalJson("InvalidSignatureException", TAMPERED, problem));
  EXPECT_EQ(0u, m_folder.Names().count("refused.xml"));
}

TEST_F(SaveRefused, RefusesStandardOutputAndTheFileOfTheToken) {
  const std::string acquire = "ssoclient acquire " + Service() + PASSWORD;
  ExpectResult(Run(acquire + "--save-refused -"), 2, "",
               "ssoclient: usage: --save-refused needs a file; a refused token is not written to standard output\n");
  ExpectResult(Run(acquire + "--out token.xml --save-refused token.xml"), 2, "",
               "ssoclient: usage: --out and --save-refused must be different files\n");
  EXPECT_EQ("", m_service.GetLog());
}

TEST_F(SaveRefused, ShowsNothingOfTheToken) {
  const Result result = Run(Line() + "-v");
  EXPECT_EQ(6, result.exitCode);
  EXPECT_THAT(result.err, Not(HasSubstr("SignatureValue")));
  EXPECT_THAT(result.err, Not(HasSubstr("wonderland")));
}

TEST_F(SaveRefused, ShowsTheNameOfTheFileInPrintableForm) {
  const Result result =
      Run("ssoclient acquire " + Service("wrong-signer") + PASSWORD + "--save-refused \"$(printf 'a\\033[2J.xml')\"");
  EXPECT_THAT(result.err, StartsWith("ssoclient: the refused token is in a\\u001B[2J.xml, which is secret"));
  EXPECT_THAT(result.err, HasSubstr("ssoclient: hint: the refused token is in a\\u001B[2J.xml, which is secret"));
  EXPECT_THAT(result.err, Not(HasSubstr("\033")));
}

} // namespace
} // namespace ToolTest
