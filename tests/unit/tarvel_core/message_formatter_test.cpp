// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/message_formatter.h>

#include <gtest/gtest.h>

#include <climits>
#include <clocale>
#include <cstdint>
#include <limits>
#include <string>

namespace Fruit {

struct Apple {
  int weight;
};

std::string FormatMessageArgument(const Apple &apple) {
  return "apple of " + std::to_string(apple.weight);
}

std::string FormatMessageArgument(const Apple *apple) {
  return apple ? FormatMessageArgument(*apple) : "(null)";
}

} // namespace Fruit

namespace Tarvel {
namespace {

TEST(MessageFormatter, PutsArgumentsIntoTheirPlaces) {
  EXPECT_EQ(MessageFormatter::ASPrint("opId=%1 START operation %2", "id", std::string("Op")),
            "opId=id START operation Op");
  EXPECT_EQ(MessageFormatter::ASPrint("%2%1%2", "a", "b"), "bab");
}

TEST(MessageFormatter, TakesNineArguments) {
  EXPECT_EQ(MessageFormatter::ASPrint("%9%8%7%6%5%4%3%2%1", 1, 2, 3, 4, 5, 6, 7, 8, 9), "987654321");
}

TEST(MessageFormatter, ReadsOneDigitOnly) {
  EXPECT_EQ(MessageFormatter::ASPrint("%10", "a"), "a0");
}

TEST(MessageFormatter, KeepsPlaceholdersWithoutArgument) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1 %2 %9", "a"), "a %2 %9");
  EXPECT_EQ(MessageFormatter::ASPrint("%1"), "%1");
}

TEST(MessageFormatter, KeepsTextThatIsNotAPlaceholder) {
  for (const char *format : {"", "%", "100 %", "%0", "%x", "% 1", "a%", "%s%n"}) {
    EXPECT_EQ(MessageFormatter::ASPrint(format, "a"), format);
  }
}

TEST(MessageFormatter, WritesTwoPercentSignsAsOne) {
  EXPECT_EQ(MessageFormatter::ASPrint("100%%", "a"), "100%");
  EXPECT_EQ(MessageFormatter::ASPrint("%%1", "a"), "%1");
  EXPECT_EQ(MessageFormatter::ASPrint("%%%1", "a"), "%a");
  EXPECT_EQ(MessageFormatter::ASPrint("%%%", "a"), "%%");
  EXPECT_EQ(MessageFormatter::ASPrint("%%%%"), "%%");
}

TEST(MessageFormatter, DoesNotReadAnArgumentAsAFormat) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1|%2", "%2", "%1%%"), "%2|%1%%");
  EXPECT_EQ(MessageFormatter::ASPrint("%1"
                                      "1",
                                      "%"),
            "%1");
}

TEST(MessageFormatter, WritesBooleansAsWords) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1 %2", true, false), "true false");
}

TEST(MessageFormatter, WritesAllDigitsOfNumbers) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1 %2", LLONG_MIN, ULLONG_MAX), "-9223372036854775808 18446744073709551615");
  EXPECT_EQ(MessageFormatter::ASPrint("%1 %2 %3", std::int8_t{-5}, std::uint8_t{200}, short{7}), "-5 200 7");
}

TEST(MessageFormatter, WritesFloatingPointWithAPointInItsShortestForm) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1 %2 %3", 0.1, -2.5, 1e300), "0.1 -2.5 1e+300");
  EXPECT_EQ(MessageFormatter::ASPrint("%1", std::numeric_limits<double>::lowest()), "-1.7976931348623157e+308");
}

TEST(MessageFormatter, WritesTextsOfEveryKind) {
  const char array[] = "array";
  const char *const pointer = "pointer";
  EXPECT_EQ(
      MessageFormatter::ASPrint("%1 %2 %3 %4 %5", array, pointer, std::string("string"), std::string_view("view"), 'c'),
      "array pointer string view c");
}

TEST(MessageFormatter, KeepsZeroBytesOfTexts) {
  EXPECT_EQ(MessageFormatter::ASPrint("<%1>", std::string("a\0b", 3)), std::string("<a\0b>", 5));
}

TEST(MessageFormatter, WritesNullForNullPointers) {
  EXPECT_EQ(
      MessageFormatter::ASPrint("%1 %2 %3", static_cast<const char *>(nullptr), static_cast<int *>(nullptr), nullptr),
      "(null) (null) (null)");
}

TEST(MessageFormatter, WritesPointersInHexadecimal) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1", reinterpret_cast<const void *>(std::uintptr_t{0xBEEF})), "0xbeef");
}

enum class Colour { RED = 3 };

TEST(MessageFormatter, WritesEnumeratorsAsNumbers) {
  EXPECT_EQ(MessageFormatter::ASPrint("%1", Colour::RED), "3");
}

TEST(MessageFormatter, FindsTheOverloadOfATypesOwnNamespace) {
  const Fruit::Apple apple{150};
  const Fruit::Apple *const none = nullptr;
  EXPECT_EQ(MessageFormatter::ASPrint("%1, %2, %3", apple, &apple, none), "apple of 150, apple of 150, (null)");
}

} // namespace
} // namespace Tarvel
