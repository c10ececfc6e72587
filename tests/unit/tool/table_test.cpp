// SPDX-License-Identifier: Apache-2.0

#include "table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>
#include <string>

namespace SsoClient::Tool {
namespace {

using testing::ElementsAre;

TEST(Wrap, BreaksAtBlanks) {
  EXPECT_THAT(Wrap("one two three", 7), ElementsAre("one two", "three"));
  EXPECT_THAT(Wrap("one two three", 8), ElementsAre("one two", "three"));
  EXPECT_THAT(Wrap("one two three", 13), ElementsAre("one two three"));
  EXPECT_THAT(Wrap("one two three", 6), ElementsAre("one", "two", "three"));
}

TEST(Wrap, BreaksAWordThatIsLongerThanALine) {
  EXPECT_THAT(Wrap("abcdefgh", 3), ElementsAre("abc", "def", "gh"));
  EXPECT_THAT(Wrap("ab cdefgh", 4), ElementsAre("ab", "cdef", "gh"));
}

TEST(Wrap, BreaksALongPathAfterASeparator) {
  EXPECT_THAT(Wrap("/saml2:Assertion/saml2:Subject", 20), ElementsAre("/saml2:Assertion/", "saml2:Subject"));
  EXPECT_THAT(Wrap("urn:abcdefghijklmnopqrstuvw", 10), ElementsAre("urn:abcdef", "ghijklmnop", "qrstuvw"));
}

TEST(Wrap, IndentsTheRestOfAnIndentedLine) {
  EXPECT_THAT(Wrap("one two\n  three four", 8), ElementsAre("one two", "  three", "  four"));
  EXPECT_THAT(Wrap("    one two", 8), ElementsAre("    one", "two")); // the blanks would take half of the line
}

TEST(Wrap, KeepsTheLinesOfTheText) {
  EXPECT_THAT(Wrap("one\ntwo three\n\nfour", 5), ElementsAre("one", "two", "three", "", "four"));
}

TEST(Wrap, HasOneLineForAnEmptyText) {
  EXPECT_THAT(Wrap("", 5), ElementsAre(""));
}

TEST(Wrap, CountsCharactersAndSplitsNone) {
  EXPECT_THAT(Wrap("\xC3\xA9\xC3\xA9\xC3\xA9", 2), ElementsAre("\xC3\xA9\xC3\xA9", "\xC3\xA9"));
  EXPECT_THAT(Wrap("\xF0\x9F\x99\x82 \xF0\x9F\x99\x82", 1), ElementsAre("\xF0\x9F\x99\x82", "\xF0\x9F\x99\x82"));
}

TEST(Wrap, EndsForTextThatIsNotUtf8AndForOnlyBlanks) {
  EXPECT_EQ(1u, Wrap(std::string(5000, '\x80'), 10).size());
  for (const std::string &line : Wrap(std::string(50, ' '), 10)) {
    EXPECT_LE(line.size(), 10u);
  }
}

TextStyle Plain(std::size_t width) {
  return {width, false};
}

Table Sample() {
  Table table({"Check", "Outcome", "Found", "To do"});
  table.Add({Cell{"form"}, Cell{"failed", Colour::RED}, Cell{"one two three four five six seven"},
             Cell{"ask the issuer for the accepted form"}});
  table.Add({Cell{"identifiers"}, Cell{"passed", Colour::GREEN}, Cell{"all"}, Cell{}});
  return table;
}

TEST(Table, IsAsWideAsItsTextIfThatFits) {
  EXPECT_EQ("Check        Outcome  Found                              To do\n"
            "form         failed   one two three four five six seven  ask the issuer for the accepted form\n"
            "identifiers  passed   all\n",
            Sample().Write(Plain(200)));
}

TEST(Table, WrapsItsLastTwoColumns) {
  EXPECT_EQ("Check        Outcome  Found                  To do\n"
            "form         failed   one two three four     ask the issuer\n"
            "                      five six seven         for the\n"
            "                                             accepted form\n"
            "identifiers  passed   all\n",
            Sample().Write(Plain(60)));
}

TEST(Table, HasNoLineBeyondTheWidth) {
  Table table = Sample();
  table.Add({Cell{}, Cell{}, Cell{std::string(500, 'x')}, Cell{std::string(300, 'y') + " z"}});
  for (const std::size_t width : {60u, 61u, 79u, 100u, 333u}) {
    std::istringstream lines(table.Write(Plain(width)));
    for (std::string line; std::getline(lines, line);) {
      EXPECT_LE(line.size(), width);
      EXPECT_TRUE(line.empty() || line.back() != ' ') << "'" << line << "'";
    }
  }
}

TEST(Table, GivesAColumnTheWidthThatTheOtherDoesNotNeed) {
  Table table({"A", "B", "C", "D"});
  table.Add({Cell{"a"}, Cell{"b"}, Cell{"c"}, Cell{std::string(60, 'd')}});
  EXPECT_EQ("A  B  C  D\na  b  c  " + std::string(51, 'd') + "\n         " + std::string(9, 'd') + "\n",
            table.Write(Plain(60)));
  table = Table({"A", "B", "C", "D"});
  table.Add({Cell{"a"}, Cell{"b"}, Cell{std::string(60, 'c')}, Cell{"d"}});
  EXPECT_EQ("A  B  C" + std::string(52, ' ') + "D\na  b  " + std::string(51, 'c') + "  d\n      " +
                std::string(9, 'c') + "\n",
            table.Write(Plain(60)));
}

TEST(Table, AlignsCharactersOfSeveralOctets) {
  Table table({"A", "B", "C", "D"});
  table.Add({Cell{"\xC3\xA9\xC3\xA9"}, Cell{"b"}, Cell{"\xF0\x9F\x99\x82x"}, Cell{"d"}});
  EXPECT_EQ("A   B  C   D\n\xC3\xA9\xC3\xA9  b  \xF0\x9F\x99\x82x  d\n", table.Write(Plain(60)));
}

TEST(Table, ColoursOnlyWhenTheStyleHasColours) {
  const std::string coloured = Sample().Write({200, true});
  EXPECT_NE(std::string::npos, coloured.find("form         \033[31mfailed\033[0m   one two"));
  EXPECT_NE(std::string::npos, coloured.find("identifiers  \033[32mpassed\033[0m   all\n"));
  EXPECT_EQ(std::string::npos, Sample().Write(Plain(200)).find('\033'));
}

} // namespace
} // namespace SsoClient::Tool
