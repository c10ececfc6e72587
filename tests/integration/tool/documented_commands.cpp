// SPDX-License-Identifier: Apache-2.0

#include "documented_commands.h"

#include "built_files.h"
#include "message_test.h"
#include "terminal.h"
#include "token_values.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>

namespace ToolTest {
namespace {

std::string ReadText(const std::string &path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), {}};
}

/// Joins each line that ends in a backslash with the next line.
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

/// The lines of `text` between each line `begin` and the next line `end`.
std::vector<std::string> LinesBetween(const std::string &text, const std::string &begin, const std::string &end) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  bool isInside = false;
  for (std::string line; std::getline(stream, line);) {
    if (!isInside) {
      isInside = line == begin;
    } else if (line == end) {
      isInside = false;
    } else {
      lines.push_back(line);
    }
  }
  return lines;
}

/// `text` with each URL that begins with `start`, up to the next white space, replaced by `url`.
std::string ReplaceUrls(std::string text, const std::string &start, const std::string &url) {
  for (std::size_t at = text.find(start); at != std::string::npos; at = text.find(start, at + url.size())) {
    text.replace(at, text.find_first_of(" \t\n", at) - at, url);
  }
  return text;
}

} // namespace

std::vector<std::string> ExamplesOfHelp(const std::string &command) {
  const std::string help = RunTool({command, "--help"}).out;
  return JoinContinued(LinesBetween(help, "Examples:", ""));
}

std::vector<std::string> ExamplesOfManual() {
  std::vector<std::string> lines;
  for (const std::string &line : LinesBetween(ReadText(ProjectPath("docs/man/ssoclient.1")), ".RS", ".RE")) {
    if (line.front() != '.') {
      lines.push_back(Fill(Fill(line, "\\-", "-"), "\\e", "\\"));
    }
  }
  return JoinContinued(lines);
}

std::vector<std::string> ExamplesOfPage(const std::string &page) {
  std::vector<std::string> examples;
  for (const std::string &line : JoinContinued(LinesBetween(ReadText(ProjectPath(page)), "```sh", "```"))) {
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
  m_folder.Write("envelope.xml", Envelope());
}

void DocumentedCommands::ExpectToRun(const std::string &example) const {
  std::string line = ReplaceUrls(example, "https://sts.corp.example/", m_service.GetUrl());
  line = ReplaceUrls(line, "https://localhost:8443/", m_service.GetUrl());
  line = Fill(line, "HTTP/sts.corp.example@", "HTTP/localhost@");
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
  const bool writesOnlyAFile =
      line.find("ssoclient sign ") != std::string::npos && line.find(" --out ") != std::string::npos;
  EXPECT_EQ(writesOnlyAFile, result.out.empty()) << line;
}

} // namespace ToolTest
