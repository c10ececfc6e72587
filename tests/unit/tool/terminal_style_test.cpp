// SPDX-License-Identifier: Apache-2.0

#include "terminal_style.h"

#include <gtest/gtest.h>

#include <string>

namespace SsoClient::Tool {
namespace {

TerminalFacts Terminal() {
  TerminalFacts facts;
  facts.isTerminal = true;
  facts.columns = 132;
  facts.terminalType = "xterm";
  return facts;
}

TEST(ChooseStyle, ColoursATerminal) {
  EXPECT_TRUE(ChooseStyle(Terminal()).hasColours);
  TerminalFacts withoutType = Terminal();
  withoutType.terminalType = nullptr;
  EXPECT_TRUE(ChooseStyle(withoutType).hasColours);
}

TEST(ChooseStyle, ColoursNothingElse) {
  TerminalFacts facts = Terminal();
  facts.isTerminal = false;
  EXPECT_FALSE(ChooseStyle(facts).hasColours);
}

TEST(ChooseStyle, ColoursNothingWithNoColor) {
  for (const char *value : {"1", "0", "false", " "}) {
    TerminalFacts facts = Terminal();
    facts.noColour = value;
    EXPECT_FALSE(ChooseStyle(facts).hasColours) << value;
  }
}

TEST(ChooseStyle, IgnoresAnEmptyNoColor) {
  TerminalFacts facts = Terminal();
  facts.noColour = "";
  EXPECT_TRUE(ChooseStyle(facts).hasColours);
}

TEST(ChooseStyle, ColoursNothingOnADumbTerminal) {
  TerminalFacts facts = Terminal();
  facts.terminalType = "dumb";
  EXPECT_FALSE(ChooseStyle(facts).hasColours);
  facts.terminalType = "dumber";
  EXPECT_TRUE(ChooseStyle(facts).hasColours);
}

TEST(ChooseStyle, HasTheWidthOfTheTerminal) {
  EXPECT_EQ(132u, ChooseStyle(Terminal()).width);
}

TEST(ChooseStyle, PrefersTheWidthInTheVariableColumns) {
  TerminalFacts facts = Terminal();
  facts.columnsVariable = "80";
  EXPECT_EQ(80u, ChooseStyle(facts).width);
  facts.isTerminal = false;
  EXPECT_EQ(80u, ChooseStyle(facts).width);
}

TEST(ChooseStyle, IgnoresColumnsThatAreNotAPositiveNumber) {
  for (const char *value : {"", "0", "-80", "+80", " 80", "80x", "0x50", "many"}) {
    TerminalFacts facts = Terminal();
    facts.columnsVariable = value;
    EXPECT_EQ(132u, ChooseStyle(facts).width) << value;
  }
}

TEST(ChooseStyle, IsAHundredWideWithoutATerminalOfAKnownWidth) {
  EXPECT_EQ(100u, ChooseStyle(TerminalFacts{}).width);
  TerminalFacts facts = Terminal();
  facts.columns = 0;
  EXPECT_EQ(100u, ChooseStyle(facts).width);
  facts.columns = 132;
  facts.isTerminal = false; // the size belongs to something else
  EXPECT_EQ(100u, ChooseStyle(facts).width);
}

TEST(ChooseStyle, KeepsTheWidthWithinItsLimits) {
  const auto widthFor = [](const char *value) {
    TerminalFacts facts;
    facts.columnsVariable = value;
    return ChooseStyle(facts).width;
  };
  EXPECT_EQ(60u, widthFor("1"));
  EXPECT_EQ(60u, widthFor("60"));
  EXPECT_EQ(61u, widthFor("61"));
  EXPECT_EQ(1000u, widthFor("1001"));
  EXPECT_EQ(1000u, widthFor("99999999999999999999999999"));
}

TEST(Coloured, EndsTheColourAfterTheText) {
  EXPECT_EQ("\033[32mpassed\033[0m", Coloured("passed", Colour::GREEN, true));
  EXPECT_EQ("\033[31mfailed\033[0m", Coloured("failed", Colour::RED, true));
  EXPECT_EQ("\033[33mnot done\033[0m", Coloured("not done", Colour::YELLOW, true));
  EXPECT_EQ("\033[1mname\033[0m", Coloured("name", Colour::BOLD, true));
}

TEST(Coloured, DoesNotChangeTextWithoutColourOrEmptyText) {
  EXPECT_EQ("text", Coloured("text", Colour::NONE, true));
  EXPECT_EQ("", Coloured("", Colour::RED, true));
  EXPECT_EQ("text", Coloured("text", Colour::RED, false));
}

} // namespace
} // namespace SsoClient::Tool
