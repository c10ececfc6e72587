// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <clocale>

namespace Tarvel {
namespace {

struct Mapping {
  std::string lower;
  std::string upper;
};

/// Letters with a simple mapping in both directions, of one to four bytes in UTF-8.
const Mapping PAIRS[] = {{"", ""},
                         {"abcdefghijklmnopqrstuvwxyz", "ABCDEFGHIJKLMNOPQRSTUVWXYZ"},
                         {"corp.example-1_@", "CORP.EXAMPLE-1_@"},
                         {"é", "É"},
                         {"ÿ", "Ÿ"},
                         {"ω", "Ω"},
                         {"жук", "ЖУК"},
                         {"ǆ", "Ǆ"},
                         {"ⱥ", "Ⱥ"},
                         {"ⓐ", "Ⓐ"},
                         {"ａ", "Ａ"},
                         {"𐐨", "𐐀"}};

TEST(StringUtilToUpper, MapsLettersOfEveryLength) {
  for (const Mapping &pair : PAIRS) {
    EXPECT_EQ(StringUtil::ToUpper(pair.lower), pair.upper);
    EXPECT_EQ(StringUtil::ToUpper(pair.upper), pair.upper);
  }
}

TEST(StringUtilToLower, MapsLettersOfEveryLength) {
  for (const Mapping &pair : PAIRS) {
    EXPECT_EQ(StringUtil::ToLower(pair.upper), pair.lower);
    EXPECT_EQ(StringUtil::ToLower(pair.lower), pair.lower);
  }
}

TEST(StringUtilToUpper, MapsOneCharacterToOneCharacter) {
  EXPECT_EQ(StringUtil::ToUpper("straße"), "STRAßE");
  EXPECT_EQ(StringUtil::ToUpper("ﬁ"), "ﬁ");
  EXPECT_EQ(StringUtil::ToUpper("ı"), "I");
}

TEST(StringUtilToLower, MapsEverySigmaToTheCommonForm) {
  EXPECT_EQ(StringUtil::ToLower("ΣΑΣ"), "σασ");
}

TEST(StringUtilToUpper, KeepsCharactersThatAreNotLetters) {
  const std::string text = "0123 \t~{}€漢字😀\x7F";
  EXPECT_EQ(StringUtil::ToUpper(text), text);
  EXPECT_EQ(StringUtil::ToLower(text), text);
}

TEST(StringUtilToUpper, KeepsZeroBytes) {
  EXPECT_EQ(StringUtil::ToUpper(std::string_view("a\0é\0b", 6)), std::string("A\0É\0B", 6));
}

TEST(StringUtilToUpper, KeepsBytesThatAreNotUtf8AndMapsTheRest) {
  struct Row {
    const char *text;
    const char *upper;
  };
  const Row table[] = {{"a\xFF"
                        "b",
                        "A\xFF"
                        "B"},
                       {"\x80é", "\x80É"},
                       {"é\xC3", "É\xC3"},
                       {"\xC3"
                        "a",
                        "\xC3"
                        "A"},
                       {"\xC1\xA1", "\xC1\xA1"},                 // overlong "a"
                       {"\xE0\x81\xA1", "\xE0\x81\xA1"},         // overlong "a"
                       {"\xE0\x83\xA9", "\xE0\x83\xA9"},         // overlong "é"
                       {"\xF0\x80\x83\xA9", "\xF0\x80\x83\xA9"}, // overlong "é"
                       {"\xED\xA0\x80z", "\xED\xA0\x80Z"},       // surrogate
                       {"\xF4\x90\x80\x80z", "\xF4\x90\x80\x80Z"},
                       {"\xF5\x80\x80\x80z", "\xF5\x80\x80\x80Z"},
                       {"\xF0\x90\x90", "\xF0\x90\x90"},
                       {"\xF0\x90\x90"
                        "a",
                        "\xF0\x90\x90"
                        "A"}};
  for (const Row &row : table) {
    EXPECT_EQ(StringUtil::ToUpper(row.text), row.upper) << testing::PrintToString(row.text);
  }
}

TEST(StringUtilToUpper, DoesNotDependOnTheProcessLocale) {
  const std::string before = std::setlocale(LC_ALL, nullptr);
  for (const char *locale : {"C", "C.UTF-8", "POSIX"}) {
    ASSERT_TRUE(std::setlocale(LC_ALL, locale)) << locale;
    EXPECT_EQ(StringUtil::ToUpper("iéж"), "IÉЖ") << locale;
    EXPECT_EQ(StringUtil::ToLower("IÉЖ"), "iéж") << locale;
  }
  std::setlocale(LC_ALL, before.c_str());
}

TEST(StringUtilToUpper, DoesNotChangeTheProcessLocale) {
  const std::string before = std::setlocale(LC_ALL, nullptr);
  StringUtil::ToUpper("é");
  EXPECT_EQ(std::string(std::setlocale(LC_ALL, nullptr)), before);
}

} // namespace
} // namespace Tarvel
