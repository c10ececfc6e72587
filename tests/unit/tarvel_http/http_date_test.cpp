// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/http_date.h>

#include <gtest/gtest.h>

namespace Tarvel::Http {
namespace {

TEST(ParseHttpDate, ReadsEachFormOfTheStandard) {
  for (const char *const text :
       {"Sun, 06 Nov 1994 08:49:37 GMT", "Sunday, 06-Nov-94 08:49:37 GMT", "Sun Nov  6 08:49:37 1994"}) {
    const boost::optional<System::DateTime> date = ParseHttpDate(text);
    ASSERT_TRUE(date) << text;
    EXPECT_EQ("1994-11-06T08:49:37.000Z", date->ToString()) << text;
  }
}

TEST(ParseHttpDate, FindsNoDateInOtherTexts) {
  for (const char *const text : {"", "now", "Sun, 31 Feb 2021 08:49:37 GMT", "Sun, 06 Nov 1994", "\x1b[31m"}) {
    EXPECT_FALSE(ParseHttpDate(text)) << text;
  }
}

} // namespace
} // namespace Tarvel::Http
