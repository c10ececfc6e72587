// SPDX-License-Identifier: Apache-2.0
// How the tool reads passwords and passphrases, seen from outside. No service listens at the address, so a run that has
// read its secrets ends with exit code 4.

#include "closed_port.h"
#include "expect_result.h"
#include "process.h"
#include "support/data_file.h"
#include "support/work_folder.h"
#include "terminal.h"

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <vector>

namespace ToolTest {
namespace {

using Testing::WorkFolder;

const std::string TOKENS = Testing::DataPath("tokens");
const std::string KEYS = Testing::DataPath("crypto");

class SecretInput : public testing::Test {
protected:
  SecretInput() {
    m_acquire = {"acquire",      "--sts",   "http://" + m_port.HostAndPort(),
                 "--allow-http", "--trust", TOKENS + "/sts-rsa.crt"};
  }

  std::vector<std::string> Acquire(const std::vector<std::string> &more) const {
    std::vector<std::string> all = m_acquire;
    all.insert(all.end(), more.begin(), more.end());
    return ToolCommand(all);
  }

  /// The same command with `more` as a command line for a shell.
  std::string ShellLine(const std::string &more) const {
    std::string line = "ssoclient";
    for (const std::string &word : m_acquire) {
      line += " '" + word + "'";
    }
    return line + " " + more;
  }

  std::string Unreachable() const {
    return "ssoclient: communication failed: Cannot connect to " + m_port.HostAndPort() + ": Connection refused\n";
  }

  const ClosedPort m_port;
  const WorkFolder m_folder;
  std::vector<std::string> m_acquire;
};

TEST_F(SecretInput, PromptsAtTheTerminalWithoutEcho) {
  TerminalSession session(Acquire({"--user", "alice@corp.example"}), TOKENS);
  session.WaitFor("Password for alice@corp.example: ");
  EXPECT_FALSE(session.Echoes());
  session.Type("wonderland\n");
  EXPECT_EQ(4, session.Finish());
  EXPECT_TRUE(session.Echoes());
  EXPECT_EQ("Password for alice@corp.example: \r\nssoclient: communication failed: Cannot connect to " +
                m_port.HostAndPort() + ": Connection refused\r\n",
            session.Shown());
}

TEST_F(SecretInput, PromptsAtTheTerminalEvenWhenStandardInputIsAnotherFile) {
  TerminalSession session(Acquire({"--key", KEYS + "/rsa2048-encrypted.key", "--cert", KEYS + "/rsa2048.crt"}), TOKENS);
  session.WaitFor("/rsa2048-encrypted.key: ");
  EXPECT_FALSE(session.Echoes());
  session.Type("open sesame\n");
  EXPECT_EQ(4, session.Finish());
  EXPECT_EQ(0u, session.Shown().find("Passphrase for " + KEYS + "/rsa2048-encrypted.key: \r\n"));
}

TEST_F(SecretInput, MakesTheTerminalQuietEvenWhenItIsGivenAsAFile) {
  TerminalSession session(Acquire({"--user", "alice", "--password-file", "-"}), TOKENS);
  session.WaitFor("Password for alice: ");
  EXPECT_FALSE(session.Echoes());
  session.Type("wonderland\n");
  EXPECT_EQ(4, session.Finish());
  EXPECT_TRUE(session.Echoes());
  EXPECT_EQ(std::string::npos, session.Shown().find("wonderland"));
}

TEST_F(SecretInput, ShowsAPromptThatCannotControlTheTerminal) {
  TerminalSession session(Acquire({"--user", "al\x1B[2Jice"}), TOKENS);
  session.WaitFor("Password for al\\u001B[2Jice: ");
}

TEST_F(SecretInput, EchoesAgainWhenInterruptedAtThePrompt) {
  TerminalSession session(Acquire({"--user", "alice", "--out", m_folder / "token.xml"}), TOKENS);
  session.WaitFor("Password for alice: ");
  session.Type("wonder");
  session.Type("\x03"); // Ctrl-C
  EXPECT_EQ(130, session.Finish());
  EXPECT_TRUE(session.Echoes());
  EXPECT_EQ(std::string::npos, session.Shown().find("wonder"));
  EXPECT_TRUE(m_folder.Names().empty());
}

TEST_F(SecretInput, EchoesAgainWhenTerminatedAtThePrompt) {
  for (const int signal : {SIGTERM, SIGHUP, SIGQUIT}) {
    TerminalSession session(Acquire({"--user", "alice"}), TOKENS);
    session.WaitFor("Password for alice: ");
    EXPECT_FALSE(session.Echoes());
    session.Signal(signal);
    EXPECT_EQ(128 + signal, session.Finish());
    EXPECT_TRUE(session.Echoes());
  }
}

// The shell starts the tool as a job that the keyboard can stop. The tool is stopped only when it has read the password
// and the terminal echoes again.
TEST_F(SecretInput, IsNotStoppedByTheKeyboardAtThePrompt) {
  TerminalSession session(
      ShellCommand("set -m; " + ShellLine("--user alice") + "; echo \"status $?\"; read answer; fg"), TOKENS);
  session.WaitFor("Password for alice: ");
  session.Type("\x1A"); // Ctrl-Z, which discards what was typed before
  session.Type("wonderland\n");
  session.WaitFor("status " + std::to_string(128 + SIGTSTP));
  EXPECT_TRUE(session.Echoes());
  session.Type("continue\n");
  EXPECT_EQ(4, session.Finish());
  EXPECT_EQ(std::string::npos, session.Shown().find("wonderland"));
}

TEST_F(SecretInput, RefusesTheEndOfInputAtThePrompt) {
  TerminalSession session(Acquire({"--user", "alice"}), TOKENS);
  session.WaitFor("Password for alice: ");
  session.Type("\x04"); // Ctrl-D
  EXPECT_EQ(7, session.Finish());
  EXPECT_TRUE(session.Echoes());
  EXPECT_EQ("Password for alice: ssoclient: file: terminal: there is no password\r\n", session.Shown());
}

TEST_F(SecretInput, NeedsAnOptionWhenThereIsNoTerminal) {
  ExpectResult(RunShell("setsid -w " + ShellLine("--user alice")), 2, "",
               "ssoclient: usage: there is no terminal to prompt for the password; give --password-file or "
               "--password-fd\n");
  ExpectResult(RunShell("setsid -w " + ShellLine("--cert rsa2048.crt --key rsa2048-encrypted.key"), KEYS), 2, "",
               "ssoclient: usage: there is no terminal to prompt for the passphrase; give --passphrase-file or "
               "--passphrase-fd\n");
}

TEST_F(SecretInput, ReadsAPasswordFromAFileAndFromStandardInputAndFromADescriptor) {
  m_folder.Write("password", "wonderland\n");
  m_folder.Write("without-line-end", "wonderland");
  for (const char *source :
       {"--password-file password", "--password-file without-line-end", "--password-file - <password",
        "--password-fd 0 <password", "--password-fd 7 7<password"}) {
    ExpectResult(RunShell(ShellLine("--user alice ") + source, m_folder.Path()), 4, "", Unreachable());
  }
}

TEST_F(SecretInput, ReadsAPassphraseFromAFileAndFromStandardInputAndFromADescriptor) {
  m_folder.Write("passphrase", "open sesame\nand no further line\n");
  for (const std::string &key : {"--cert " + KEYS + "/rsa2048.crt --key " + KEYS + "/rsa2048-encrypted.key ",
                                 "--p12 " + KEYS + "/rsa2048.p12 "}) {
    for (const char *source : {"--passphrase-file passphrase", "--passphrase-file - <passphrase",
                               "--passphrase-fd 0 <passphrase", "--passphrase-fd 7 7<passphrase"}) {
      ExpectResult(RunShell(ShellLine(key) + source, m_folder.Path()), 4, "", Unreachable());
    }
  }
}

TEST_F(SecretInput, DoesNotPromptForAPassphraseThatIsNotNeeded) {
  for (const char *key : {"--cert rsa2048.crt --key rsa2048.key", "--p12 rsa2048-no-passphrase.p12",
                          "--cert rsa2048.crt --key rsa2048.key --passphrase-file missing"}) {
    ExpectResult(RunShell("setsid -w " + ShellLine(key), KEYS), 4, "", Unreachable());
  }
}

TEST_F(SecretInput, RefusesAWrongPassphrase) {
  const std::string wrong = "echo wonderland | ";
  ExpectResult(RunShell(wrong + ShellLine("--cert rsa2048.crt --key rsa2048-traditional-encrypted.key "
                                          "--passphrase-file - --format json"),
                        KEYS),
               7, "",
               R"({"schema":1,"error":{"class":"WrongPassphraseException","message":)"
               R"("rsa2048-traditional-encrypted.key: The passphrase of the private key is wrong: )"
               R"(error:1C800064:Provider routines::bad decrypt; error:04800065:PEM routines::bad decrypt"}})"
               "\n");
  ExpectResult(RunShell(wrong + ShellLine("--p12 rsa2048.p12 --passphrase-fd 0"), KEYS), 7, "",
               "ssoclient: passphrase: rsa2048.p12: The passphrase of the PKCS#12 key store is wrong\n");
}

TEST_F(SecretInput, RefusesAMissingSecret) {
  m_folder.Write("empty", "");
  const auto run = [&](const std::string &source) {
    return RunShell(ShellLine("--user alice ") + source, m_folder.Path());
  };
  ExpectResult(run("--password-file empty"), 7, "", "ssoclient: file: empty: there is no password\n");
  ExpectResult(run("--password-file missing"), 7, "", "ssoclient: file: missing: No such file or directory\n");
  ExpectResult(run("--password-file ."), 7, "", "ssoclient: file: .: Is a directory\n");
  ExpectResult(run("--password-file - </dev/null"), 7, "", "ssoclient: file: -: there is no password\n");
  ExpectResult(run("--password-fd 9"), 7, "", "ssoclient: file: descriptor 9: Bad file descriptor\n");
}

TEST_F(SecretInput, AcceptsASecretOf4096OctetsButNoLongerOne) {
  m_folder.Write("longest", std::string(4096, 'p') + "\n");
  m_folder.Write("too-long", std::string(4097, 'p') + "\n");
  const auto run = [&](const std::string &file) {
    return RunShell(ShellLine("--user alice --password-file ") + file, m_folder.Path());
  };
  ExpectResult(run("longest"), 4, "", Unreachable());
  ExpectResult(run("too-long"), 7, "", "ssoclient: file: a password or passphrase is at most 4096 octets long\n");
  ExpectResult(run("/dev/zero"), 7, "", "ssoclient: file: a password or passphrase is at most 4096 octets long\n");
}

TEST_F(SecretInput, NeverShowsAPasswordThatXmlCannotCarry) {
  m_folder.Write("password", "wonder\x01land\n");
  const Result result = RunShell(ShellLine("-v --user alice --password-file password"), m_folder.Path());
  EXPECT_EQ(2, result.exitCode);
  EXPECT_NE(std::string::npos, result.err.find("ssoclient: usage: Invalid argument : ")) << result.err;
  EXPECT_EQ(std::string::npos, result.err.find("land")) << result.err;
}

} // namespace
} // namespace ToolTest
