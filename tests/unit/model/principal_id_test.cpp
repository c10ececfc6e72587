// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/principal_id.h>

#include <tarvel/core/message_formatter.h>

#include <gtest/gtest.h>

#include <functional>
#include <random>
#include <set>
#include <string>
#include <unordered_set>
#include <vector>

namespace {

using SsoClient::PrincipalId;
using SsoClient::PrincipalIdLess;
using Tarvel::MessageFormatter;

TEST(PrincipalIdEquality, IgnoresLetterCaseOfNameAndDomain) {
  EXPECT_TRUE((PrincipalId{"alice", "corp.example"} == PrincipalId{"ALICE", "Corp.Example"}));
  EXPECT_FALSE((PrincipalId{"alice", "corp.example"} != PrincipalId{"Alice", "corp.EXAMPLE"}));
}

TEST(PrincipalIdEquality, IgnoresLetterCaseBeyondAscii) {
  EXPECT_TRUE((PrincipalId{"j\u00fcrgen", "corp"} == PrincipalId{"J\u00dcRGEN", "CORP"}));
}

TEST(PrincipalIdEquality, HoldsForDistinctLettersWithTheSameUpperCaseForm) {
  EXPECT_TRUE((PrincipalId{"\u0131ris", "corp"} == PrincipalId{"iris", "corp"}));     // dotless i
  EXPECT_TRUE((PrincipalId{"alice", "\u017fales"} == PrincipalId{"alice", "sales"})); // long s
  EXPECT_FALSE((PrincipalId{"\u0130ris", "corp"} == PrincipalId{"iris", "corp"}));    // I with a dot is upper case
}

TEST(PrincipalIdEquality, DoesNotHoldForOtherNamesAndDomains) {
  const PrincipalId alice{"alice", "corp"};
  EXPECT_FALSE((alice == PrincipalId{"bob", "corp"}));
  EXPECT_FALSE((alice == PrincipalId{"alice", "branch"}));
  EXPECT_FALSE((alice == PrincipalId{"corp", "alice"}));
  EXPECT_FALSE((alice == PrincipalId{"alice", ""}));
  EXPECT_TRUE((alice != PrincipalId{"alice ", "corp"}));
}

TEST(PrincipalIdEquality, HoldsForTheSameObject) {
  const PrincipalId alice{"alice", "corp"};
  EXPECT_TRUE(alice == alice);
}

TEST(PrincipalIdLess, OrdersByNameAndThenByDomain) {
  const PrincipalIdLess less;
  EXPECT_TRUE(less({"alice", "corp"}, {"bob", "branch"}));
  EXPECT_FALSE(less({"bob", "branch"}, {"alice", "corp"}));
  EXPECT_TRUE(less({"alice", "branch"}, {"alice", "corp"}));
  EXPECT_FALSE(less({"alice", "corp"}, {"alice", "branch"}));
}

TEST(PrincipalIdLess, IgnoresLetterCaseAsEqualityDoes) {
  const PrincipalIdLess less;
  EXPECT_TRUE(less({"alice", "x"}, {"BOB", "x"}));
  EXPECT_TRUE(less({"ALICE", "x"}, {"bob", "x"}));
  EXPECT_FALSE(less({"j\u00fcrgen", "corp"}, {"J\u00dcRGEN", "CORP"}));
  EXPECT_FALSE(less({"J\u00dcRGEN", "CORP"}, {"j\u00fcrgen", "corp"}));
  EXPECT_FALSE(less({"x", "corp"}, {"x", "CORP"}));
  EXPECT_FALSE(less({"x", "CORP"}, {"x", "corp"}));
}

TEST(PrincipalIdHash, IgnoresLetterCaseAsEqualityDoes) {
  const std::hash<PrincipalId> hash;
  EXPECT_EQ(hash({"alice", "corp.example"}), hash({"ALICE", "Corp.Example"}));
  EXPECT_EQ(hash({"j\u00fcrgen", "corp"}), hash({"J\u00dcRGEN", "CORP"}));
  EXPECT_EQ(hash({"\u0131ris", "\u017fales"}), hash({"iris", "sales"}));
}

TEST(PrincipalIdHash, DependsOnNameAndDomainAndOnWhichIsWhich) {
  const std::hash<PrincipalId> hash;
  EXPECT_NE(hash({"alice", "corp"}), hash({"bob", "corp"}));
  EXPECT_NE(hash({"alice", "corp"}), hash({"alice", "branch"}));
  EXPECT_NE(hash({"alice", "corp"}), hash({"corp", "alice"}));
}

TEST(PrincipalId, IsAKeyOfSetsWhateverItsLetterCase) {
  const std::vector<PrincipalId> principals{{"alice", "corp"}, {"ALICE", "Corp"}, {"bob", "corp"}, {"alice", "branch"}};
  EXPECT_EQ((std::unordered_set<PrincipalId>(principals.begin(), principals.end())).size(), 3u);
  const std::set<PrincipalId, PrincipalIdLess> ordered(principals.begin(), principals.end());
  EXPECT_EQ(ordered.size(), 3u);
  EXPECT_EQ(ordered.count({"BOB", "CORP"}), 1u);
}

/// Up to three of these letters: many differ only in case, some are outside ASCII, and one byte is not UTF-8.
std::string RandomText(std::mt19937 &random) {
  const std::vector<std::string> letters{"a",      "A",      "i",      "I",      "\u0131", "\u0130", "s", "S",
                                         "\u017f", "\u00fc", "\u00dc", "\u03c3", "\u03a3", "\u03c2", "1", "\xff"};
  std::string text;
  for (auto length = random() % 4; length > 0; --length) {
    text += letters[random() % letters.size()];
  }
  return text;
}

TEST(PrincipalId, HasAHashAndAnOrderThatAgreeWithEqualityForRandomPairs) {
  std::mt19937 random(13); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same pairs in each run
  const std::hash<PrincipalId> hash;
  const PrincipalIdLess less;
  int equalPairs = 0;
  for (int i = 0; i < 20000; ++i) {
    const PrincipalId left{RandomText(random), RandomText(random)};
    const PrincipalId right{RandomText(random), RandomText(random)};
    const bool isEqual = left == right;
    equalPairs += isEqual ? 1 : 0;
    ASSERT_EQ(isEqual, !less(left, right) && !less(right, left)) << left.ToString() << right.ToString();
    ASSERT_FALSE(less(left, right) && less(right, left)) << left.ToString() << right.ToString();
    if (isEqual) {
      ASSERT_EQ(hash(left), hash(right)) << left.ToString() << right.ToString();
    }
  }
  EXPECT_GT(equalPairs, 50);
}

TEST(PrincipalIdToString, HasNoBlankAfterTheDomainLabel) {
  EXPECT_EQ("{Name: alice; Domain:CORP}", (PrincipalId{"alice", "CORP"}).ToString());
  EXPECT_EQ("{Name: ; Domain:}", PrincipalId{}.ToString());
}

TEST(PrincipalIdToString, WritesPlaceholdersInNamesAsText) {
  EXPECT_EQ("{Name: %2; Domain:%1}", (PrincipalId{"%2", "%1"}).ToString());
}

TEST(PrincipalIdAsMessageArgument, PrintsItsText) {
  PrincipalId alice{"alice", "CORP"};
  const PrincipalId *const constant = &alice;
  EXPECT_EQ("<{Name: alice; Domain:CORP}>", MessageFormatter::ASPrint("<%1>", constant));
  EXPECT_EQ("<{Name: alice; Domain:CORP}>", MessageFormatter::ASPrint("<%1>", &alice));
}

TEST(PrincipalIdAsMessageArgument, PrintsNullPointer) {
  const PrincipalId *const nobody = nullptr;
  EXPECT_EQ("<(null)>", MessageFormatter::ASPrint("<%1>", nobody));
}

} // namespace
