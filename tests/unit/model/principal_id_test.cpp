// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/principal_id.h>

#include <tarvel/core/message_formatter.h>

#include <gtest/gtest.h>

namespace {

using SsoClient::PrincipalId;
using Tarvel::MessageFormatter;

TEST(PrincipalIdEquality, IgnoresLetterCaseOfNameAndDomain) {
  EXPECT_TRUE((PrincipalId{"alice", "corp.example"} == PrincipalId{"ALICE", "Corp.Example"}));
  EXPECT_FALSE((PrincipalId{"alice", "corp.example"} != PrincipalId{"Alice", "corp.EXAMPLE"}));
}

TEST(PrincipalIdEquality, IgnoresLetterCaseBeyondAscii) {
  EXPECT_TRUE((PrincipalId{"j\u00fcrgen", "corp"} == PrincipalId{"J\u00dcRGEN", "CORP"}));
}

TEST(PrincipalIdEquality, JoinsDistinctLettersOfOneUpperCaseForm) {
  EXPECT_TRUE((PrincipalId{"\u0131ris", "corp"} == PrincipalId{"iris", "corp"}));     // dotless i
  EXPECT_TRUE((PrincipalId{"alice", "\u017fales"} == PrincipalId{"alice", "sales"})); // long s
  EXPECT_FALSE((PrincipalId{"\u0130ris", "corp"} == PrincipalId{"iris", "corp"}));    // I with a dot stays itself
}

TEST(PrincipalIdEquality, TellsOtherNamesAndDomainsApart) {
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

TEST(PrincipalIdToString, HasNoBlankAfterTheDomainLabel) {
  EXPECT_EQ("{Name: alice; Domain:CORP}", (PrincipalId{"alice", "CORP"}).ToString());
  EXPECT_EQ("{Name: ; Domain:}", PrincipalId{}.ToString());
}

TEST(PrincipalIdToString, TakesPlaceholdersInNamesAsText) {
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
