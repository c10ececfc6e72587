// SPDX-License-Identifier: Apache-2.0
#include "documented_commands.h"

#include "terminal.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <regex>
#include <sstream>

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

} // namespace

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

std::vector<std::string> ExamplesOfPage(const std::string &page) {
  std::vector<std::string> examples;
  for (const std::string &line :
       JoinContinued(LinesBetween(ReadText(PROJECT_FOLDER "/" + page), std::regex("```sh"), std::regex("```")))) {
    if (line.find("ssoclient ") == 0) {
      examples.push_back(line);
    }
  }
  return examples;
}

bool IsForTickets(const std::string &example) {
  return example.find("--gss") != std::string::npos;
}

DocumentedCommands::DocumentedCommands(const std::vector<std::string> &serviceArguments)
    : ServiceTest(serviceArguments) {
  std::filesystem::copy_file(m_folder / "ca.pem", m_folder / "authority.pem");
  std::filesystem::copy_file(m_service.PathOf("foreign.crt"), m_folder / "next-sts.pem");
}

void DocumentedCommands::ExpectToRun(const std::string &example) const {
  std::string line =
      std::regex_replace(example, std::regex("https://(sts\\.corp\\.example|localhost:8443)/\\S*"), m_service.GetUrl());
  line = std::regex_replace(line, std::regex("HTTP/sts\\.corp\\.example@"), "HTTP/localhost@");
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

} // namespace ToolTest
