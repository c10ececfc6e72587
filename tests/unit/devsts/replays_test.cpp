// SPDX-License-Identifier: Apache-2.0

#include "replays.h"

#include <gtest/gtest.h>

#include <chrono>

namespace DevSts {
namespace {

using std::chrono::milliseconds;
using Answer = Replays::Answer;

constexpr Time NOW{milliseconds(1'000'000)};
constexpr Time LATER = NOW + milliseconds(10);

TEST(Replays, RecognisesARepeatedMessageUntilItsTime) {
  Replays replays(2);
  EXPECT_EQ(replays.Remember("a", LATER, NOW), Answer::FIRST);
  EXPECT_EQ(replays.Remember("a", LATER, NOW), Answer::REPEATED);
  EXPECT_EQ(replays.Remember("a", LATER, LATER), Answer::REPEATED);
  EXPECT_EQ(replays.Remember("a", LATER, LATER + milliseconds(1)), Answer::FIRST);
}

TEST(Replays, RemembersAtMostItsCapacity) {
  Replays replays(2);
  EXPECT_EQ(replays.Remember("a", LATER + milliseconds(5), NOW), Answer::FIRST);
  EXPECT_EQ(replays.Remember("b", LATER, NOW), Answer::FIRST);
  EXPECT_EQ(replays.Remember("c", LATER, NOW), Answer::FULL);
  EXPECT_EQ(replays.Remember("b", LATER, NOW), Answer::REPEATED);
  EXPECT_EQ(replays.Remember("c", LATER + milliseconds(9), LATER + milliseconds(1)), Answer::FIRST);
  EXPECT_EQ(replays.Remember("a", LATER, LATER + milliseconds(1)), Answer::REPEATED);
}

} // namespace
} // namespace DevSts
