// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <string>

namespace Tarvel {
namespace {

TEST(Shorten, ReturnsATextOfAtMostTheGivenLengthUnchanged) {
  EXPECT_EQ("", StringUtil::Shorten("", 0));
  EXPECT_EQ("abc", StringUtil::Shorten("abc", 3));
  EXPECT_EQ(std::string(1024, 'x'), StringUtil::Shorten(std::string(1024, 'x')));
}

TEST(Shorten, CountsTheBytesThatAreLeftOut) {
  EXPECT_EQ("... (3 more bytes)", StringUtil::Shorten("abc", 0));
  EXPECT_EQ("ab... (1 more bytes)", StringUtil::Shorten("abc", 2));
  EXPECT_EQ(std::string(1024, 'x') + "... (1 more bytes)", StringUtil::Shorten(std::string(1025, 'x')));
}

TEST(Shorten, CutsBetweenTwoCharacters) {
  const std::string text = "a\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80z"; // characters of 1, 2, 3, 4 and 1 bytes
  const char *const expected[] = {"... (11 more bytes)",
                                  "a... (10 more bytes)",
                                  "a... (10 more bytes)",
                                  "a\xC3\xA4... (8 more bytes)",
                                  "a\xC3\xA4... (8 more bytes)",
                                  "a\xC3\xA4... (8 more bytes)",
                                  "a\xC3\xA4\xE2\x82\xAC... (5 more bytes)",
                                  "a\xC3\xA4\xE2\x82\xAC... (5 more bytes)",
                                  "a\xC3\xA4\xE2\x82\xAC... (5 more bytes)",
                                  "a\xC3\xA4\xE2\x82\xAC... (5 more bytes)",
                                  "a\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80... (1 more bytes)"};
  for (std::size_t most = 0; most < text.size(); ++most) {
    EXPECT_EQ(expected[most], StringUtil::Shorten(text, most)) << most;
  }
}

TEST(Shorten, CutsTextThatIsNotUtf8AtTheGivenLength) {
  const std::string text(1000, '\x80');
  EXPECT_EQ(text.substr(0, 97) + "... (903 more bytes)", StringUtil::Shorten(text, 100));
}

} // namespace
} // namespace Tarvel
