// SPDX-License-Identifier: Apache-2.0
// Each command line that the help, the manual and the README show does what a reader expects: it runs.

#include "service_test.h"
#include "terminal.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

namespace ToolTest {
namespace {

std::string ReadText(const std::string &path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), {}};
}

/// Puts lines that end in a backslash together with the ones behind them.
std::vector<std::string> JoinContinued(const std::vector<std::string> &lines) {
  std::vector<std::string> joined;
  bool isContinued = false;
  for (const std::string &line : lines) {
    if (isContinued) {
      joined.back() += "\n" + line;
    } else {
      joined.push_back(line);
    }
    isContinued = !line.empty() && line.back() == '\\';
  }
  return joined;
}

/// The lines of `text` from behind the one that matches `begin` to before the next one that matches `end`, over and over.
std::vector<std::string> LinesBetween(const std::string &text, const std::regex &begin, const std::regex &end) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  bool isInside = false;
  for (std::string line; std::getline(stream, line);) {
    if (!isInside) {
      isInside = std::regex_match(line, begin);
    } else if (std::regex_match(line, end)) {
      isInside = false;
    } else {
      lines.push_back(line);
    }
  }
  return lines;
}

std::vector<std::string> ExamplesOfHelp(const std::string &command) {
  const std::string help = RunTool({command, "--help"}).out;
  return JoinContinued(LinesBetween(help, std::regex("Examples:"), std::regex("")));
}

std::vector<std::string> ExamplesOfManual() {
  std::vector<std::string> lines;
  for (const std::string &line :
       LinesBetween(ReadText(PROJECT_FOLDER "/docs/man/ssoclient.1"), std::regex("\\.RS"), std::regex("\\.RE"))) {
    if (line.front() != '.') {
      lines.push_back(
          std::regex_replace(std::regex_replace(line, std::regex("\\\\-"), "-"), std::regex("\\\\e"), "\\"));
    }
  }
  return JoinContinued(lines);
}

std::vector<std::string> ExamplesOfReadme() {
  std::vector<std::string> examples;
  for (const std::string &line :
       JoinContinued(LinesBetween(ReadText(PROJECT_FOLDER "/README.md"), std::regex("```sh"), std::regex("```")))) {
    if (line.find("ssoclient ") == 0) {
      examples.push_back(line);
    }
  }
  return examples;
}

class DocumentedCommands : public ServiceTest {
protected:
  DocumentedCommands() {
    std::filesystem::copy_file(m_folder / "ca.pem", m_folder / "authority.pem");
    std::filesystem::copy_file(m_service.PathOf("foreign.crt"), m_folder / "next-sts.pem");
  }

  /// Runs one example, whose service is the one that is running; where it asks for the password, types it.
  void ExpectToRun(const std::string &example) const {
    const std::string line =
        std::regex_replace(example, std::regex("https://sts\\.corp\\.example/\\S*"), m_service.GetUrl());
    const bool asks = line.find("--user") != std::string::npos && line.find("--password-") == std::string::npos;
    if (asks) {
      TerminalSession session(ShellCommand(line), m_folder.Path());
      session.WaitFor("Password for alice@corp.example: ");
      session.Type("wonderland\n");
      EXPECT_EQ(0, session.Finish()) << line << '\n' << session.Shown();
      return;
    }
    const Result result = Run(line);
    EXPECT_EQ(0, result.exitCode) << line << '\n' << result.err;
    EXPECT_EQ("", result.err) << line;
    EXPECT_NE("", result.out) << line;
  }
};

TEST_F(DocumentedCommands, OfTheHelpRun) {
  Acquire("token.xml", PASSWORD);
  for (const char *command : {"acquire", "renew", "validate", "verify", "inspect"}) {
    const std::vector<std::string> examples = ExamplesOfHelp(command);
    EXPECT_FALSE(examples.empty()) << command;
    for (const std::string &example : examples) {
      EXPECT_EQ(0u, example.find(std::string("  ssoclient ") + command + " ")) << example;
      ExpectToRun(example);
    }
  }
}

TEST_F(DocumentedCommands, OfTheManualRun) {
  Acquire("token.xml", PASSWORD);
  const std::vector<std::string> examples = ExamplesOfManual();
  EXPECT_FALSE(examples.empty());
  for (const std::string &example : examples) {
    EXPECT_NE(std::string::npos, example.find("ssoclient ")) << example;
    ExpectToRun(example);
  }
}

TEST_F(DocumentedCommands, OfTheReadmeRun) {
  const std::vector<std::string> examples = ExamplesOfReadme();
  EXPECT_FALSE(examples.empty());
  for (const std::string &example : examples) {
    ExpectToRun(example);
  }
}

} // namespace
} // namespace ToolTest
