// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

#include <gmock/gmock.h>

#include <set>
#include <thread>

namespace Tarvel {
namespace {

TEST(StringUtilGenerateUuid, ReturnsARandomUuidOfVersion4) {
  for (int i = 0; i < 100; ++i) {
    EXPECT_THAT(StringUtil::GenerateUuid(),
                testing::MatchesRegex("[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}"));
  }
}

TEST(StringUtilGenerateUuid, NeverRepeatsOnTwoThreads) {
  constexpr std::size_t COUNT = 2'000;
  std::set<std::string> sets[2];
  std::thread other([&] {
    while (sets[1].size() < COUNT) {
      ASSERT_TRUE(sets[1].insert(StringUtil::GenerateUuid()).second);
    }
  });
  while (sets[0].size() < COUNT) {
    EXPECT_TRUE(sets[0].insert(StringUtil::GenerateUuid()).second);
  }
  other.join();
  sets[0].merge(sets[1]);
  EXPECT_EQ(sets[0].size(), 2 * COUNT);
}

} // namespace
} // namespace Tarvel
