// SPDX-License-Identifier: Apache-2.0
// The manual lists the same options and exit codes as the help.

#include "built_files.h"
#include "help_options.h"
#include "process.h"
#include "token_values.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <fstream>
#include <iterator>
#include <set>
#include <sstream>
#include <string>

namespace ToolTest {
namespace {

/// The text of the manual, without its escapes.
std::string ReadManual() {
  std::ifstream file(ProjectPath("docs/man/ssoclient.1"));
  std::string text{std::istreambuf_iterator<char>(file), {}};
  for (const char *font : {"\\fB", "\\fI", "\\fR"}) {
    text = Fill(text, font, "");
  }
  return Fill(text, "\\-", "-");
}

/// The options that have a paragraph of their own in the manual, in any font.
std::set<std::string> OptionsOfManual() {
  const std::string manual = ReadManual();
  std::set<std::string> options;
  for (const char *paragraph : {"\n.TP\n", "\n.TQ\n"}) {
    for (const char *fonts : {".B ", ".BI ", ".BR "}) {
      options.merge(OptionsAfter(std::string(paragraph) + fonts, manual, " \", \" "));
    }
  }
  return options;
}

/// `line` with one blank between the number at its beginning and the text after it.
std::string WithOneBlank(const std::string &line) {
  const std::size_t number = line.find_first_not_of(' ');
  const std::size_t blanks = line.find_first_not_of("0123456789", number);
  const std::size_t text = line.find_first_not_of(" \t", blanks);
  if (number == blanks || blanks == text || text == std::string::npos) {
    return line;
  }
  return line.substr(number, blanks - number) + " " + line.substr(text);
}

/// The lines between `begin` and `end`, each with one blank between its number and the text after it.
std::string TableIn(const std::string &text, const std::string &begin, const std::string &end) {
  const std::size_t first = text.find(begin) + begin.size();
  std::istringstream lines(text.substr(first, text.find(end, first) - first));
  std::string table;
  for (std::string line; std::getline(lines, line);) {
    table += WithOneBlank(line) + "\n";
  }
  return table;
}

TEST(Manual, ListsExactlyTheOptionsOfTheHelp) {
  std::set<std::string> helped;
  for (const char *command :
       {"acquire", "token", "renew", "validate", "verify", "inspect", "sign", "check-message", "doctor", "dialect"}) {
    helped.merge(OptionsOfHelp(command));
  }
  EXPECT_EQ(1u, helped.erase("--help"));
  EXPECT_EQ(1u, helped.count("--sts"));
  EXPECT_EQ(helped, OptionsOfManual());
}

TEST(Manual, ListsTheExitCodesOfTheHelp) {
  const std::string codes = TableIn(ReadManual(), "\nl l.\n", "\n.TE\n");
  EXPECT_EQ(TableIn(RunTool({"--help"}).out, "Exit codes:\n", "\n\n"), codes);
  EXPECT_EQ(0u, codes.find("0 done; for validate: the token is valid\n1 unexpected failure\n")) << codes;
}

} // namespace
} // namespace ToolTest
