// SPDX-License-Identifier: Apache-2.0
// The manual tells what the help tells: the same options, the same exit codes.

#include "process.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <sstream>
#include <string>

namespace ToolTest {
namespace {

/// The manual without the escapes that its text needs there.
std::string ReadManual() {
  std::ifstream file(PROJECT_FOLDER "/docs/man/ssoclient.1");
  const std::string text{std::istreambuf_iterator<char>(file), {}};
  return std::regex_replace(std::regex_replace(text, std::regex("\\\\f[BIR]"), ""), std::regex("\\\\-"), "-");
}

/// The first group of each match.
std::set<std::string> FindAll(const std::string &text, const char *pattern) {
  const std::regex regex(pattern, std::regex::ECMAScript | std::regex::multiline);
  std::set<std::string> found;
  for (std::sregex_iterator match(text.begin(), text.end(), regex), end; match != end; ++match) {
    found.insert((*match)[1]);
  }
  return found;
}

/// The lines from behind `begin` to `end`, each number and the text behind it with one blank between.
std::string TableIn(const std::string &text, const std::string &begin, const std::string &end) {
  const std::size_t first = text.find(begin) + begin.size();
  const std::string table = text.substr(first, text.find(end, first) - first);
  return std::regex_replace(table, std::regex("^ *([0-9]+)[ \t]+", std::regex::multiline), "$1 ");
}

TEST(Manual, TellsTheOptionsOfTheHelpAndNoOthers) {
  std::set<std::string> helped;
  for (const char *command : {"acquire", "renew", "validate", "verify", "inspect"}) {
    helped.merge(FindAll(RunTool({command, "--help"}).out, "^  (?:-[a-z],)?(--[a-z0-9-]+)"));
  }
  EXPECT_EQ(1u, helped.erase("--help"));
  EXPECT_EQ(1u, helped.count("--sts"));
  EXPECT_EQ(helped, FindAll(ReadManual(), "^\\.T[PQ]\n\\.B[IR]* (?:-[a-z] \", \" )?(--[a-z0-9-]+)"));
}

TEST(Manual, TellsTheExitCodesOfTheHelp) {
  const std::string codes = TableIn(ReadManual(), "\nl l.\n", "\n.TE\n");
  EXPECT_EQ(TableIn(RunTool({"--help"}).out, "Exit codes:\n", "\n\n"), codes);
  EXPECT_EQ(0u, codes.find("0 done; for validate: the token is valid\n1 unexpected failure\n")) << codes;
}

} // namespace
} // namespace ToolTest
