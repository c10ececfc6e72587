// SPDX-License-Identifier: Apache-2.0

#include "unmet_request.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace SsoClient::Tool {
namespace {

using Tarvel::System::DateTime;
using testing::ElementsAre;
using testing::IsEmpty;

const DateTime ASKED_AT("2026-01-01T12:00:00Z");

TokenSpec SpecFor(std::int64_t lifetimeSec) {
  TokenSpec spec;
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

/// The facts of a token that is, by default, valid for an hour from the time of the request.
TokenFacts HourFrom(const char *start = "2026-01-01T12:00:00Z", const char *end = "2026-01-01T13:00:00Z") {
  TokenFacts facts;
  facts.startDate = DateTime(start);
  facts.endDate = DateTime(end);
  return facts;
}

std::vector<std::string> KeysOf(const std::vector<UnmetRequest> &unmet) {
  std::vector<std::string> keys;
  keys.reserve(unmet.size());
  for (const UnmetRequest &request : unmet) {
    keys.emplace_back(request.key);
  }
  return keys;
}

/// The unmet requests as text, for a token with these facts.
std::vector<std::string> WantedOf(const TokenSpec &spec, const TokenFacts &facts, const ServiceDialect &dialect = {}) {
  std::vector<std::string> wanted;
  for (const UnmetRequest &request : FindUnmet(spec, dialect, ASKED_AT, facts, 0)) {
    wanted.push_back(request.wanted);
  }
  return wanted;
}

TokenSpec SpecWithEverything() {
  TokenSpec spec = SpecFor(7200);
  spec.delegateTo = "bob@corp.example";
  spec.renewable = true;
  spec.delegable = true;
  spec.advice = {{"audit", {{"by", {"alice"}}}}};
  spec.audienceRestriction = {"https://mail.corp.example/"};
  return spec;
}

TEST(FindUnmet, ListsEverythingThatIsMissingInAFixedOrder) {
  EXPECT_THAT(KeysOf(FindUnmet(SpecWithEverything(), ServiceDialect(), ASKED_AT, HourFrom(), 0)),
              ElementsAre("delegation", "renewable", "delegable", "advice", "audience", "lifetime"));
  EXPECT_THAT(WantedOf(SpecWithEverything(), HourFrom()),
              ElementsAre("delegation to bob@corp.example; the token is not delegated", "a renewable token",
                          "a delegable token", "the advice audit:by=alice",
                          "restriction to the audience https://mail.corp.example/; the token is not restricted",
                          "a lifetime of 7200 seconds; the token ends at 2026-01-01T13:00:00.000Z"));
}

TEST(FindUnmet, ListsNothingWhenNothingIsMissing) {
  TokenFacts facts = HourFrom("2026-01-01T12:00:00Z", "2026-01-01T14:00:00Z");
  facts.delegationChain = {{{"bob", "corp.example"}, DateTime()}};
  facts.renewable = true;
  facts.delegable = true;
  facts.advice = {{"audit", {{"by", {"alice"}}}}};
  facts.audience = {"https://mail.corp.example/"};
  EXPECT_THAT(FindUnmet(SpecWithEverything(), ServiceDialect(), ASKED_AT, facts, 0), IsEmpty());
}

TEST(FindUnmet, ListsWhatTheTokenDoesNotState) {
  TokenSpec spec = SpecFor(60);
  spec.renewable = true;
  EXPECT_THAT(WantedOf(spec, TokenFacts()),
              ElementsAre("a renewable token", "a lifetime of 60 seconds; the token ends at no known time"));
}

TEST(FindUnmet, AcceptsATokenWithMoreThanWasAskedFor) {
  TokenFacts facts = HourFrom("2026-01-01T12:00:00Z", "2026-01-02T12:00:00Z");
  facts.delegationChain = {{{"bob", "corp.example"}, DateTime()}};
  facts.renewable = true;
  facts.delegable = true;
  facts.advice = {{"audit", {{"by", {"alice"}}}}};
  facts.audience = {"https://mail.corp.example/"};
  EXPECT_THAT(FindUnmet(SpecFor(3600), ServiceDialect(), ASKED_AT, facts, 0), IsEmpty());
}

TEST(FindUnmet, IgnoresLetterCaseInTheLastDelegate) {
  TokenSpec spec = SpecFor(3600);
  spec.delegateTo = "Bob@CORP.example";
  TokenFacts facts = HourFrom();
  facts.delegationChain = {{{"gateway", "corp.example"}, DateTime()}, {{"bob", "corp.example"}, DateTime()}};
  EXPECT_THAT(WantedOf(spec, facts), IsEmpty());
  facts.delegationChain = {{{"bob", "corp.example"}, DateTime()}, {{"gateway", "corp.example"}, DateTime()}};
  EXPECT_THAT(WantedOf(spec, facts),
              ElementsAre("delegation to Bob@CORP.example; the token is delegated to gateway@corp.example"));
  facts.delegationChain = {{{"bob", "other.example"}, DateTime()}};
  EXPECT_THAT(WantedOf(spec, facts),
              ElementsAre("delegation to Bob@CORP.example; the token is delegated to bob@other.example"));
}

TEST(FindUnmet, ComparesADelegateWithoutDomainOnlyByName) {
  TokenSpec spec = SpecFor(3600);
  spec.delegateTo = "bob";
  TokenFacts facts = HourFrom();
  facts.delegationChain = {{{"Bob", "corp.example"}, DateTime()}};
  EXPECT_THAT(WantedOf(spec, facts), IsEmpty());
  facts.delegationChain = {{{"bobby", "corp.example"}, DateTime()}};
  EXPECT_THAT(WantedOf(spec, facts), ElementsAre("delegation to bob; the token is delegated to bobby@corp.example"));
}

TEST(FindUnmet, RequiresEachValueOfEachAdviceUnderItsSourceAndName) {
  TokenSpec spec = SpecFor(3600);
  spec.advice = {{"mapper", {{"color", {"green", "blue"}}, {"size", {"10"}}}}, {"audit", {{"by", {"alice"}}}}};
  TokenFacts facts = HourFrom();
  facts.advice = {{"audit", {{"by", {"bob", "alice"}}, {"color", {"blue"}}}},
                  {"mapper", {{"size", {"green"}}, {"shape", {"10"}}}},
                  {"mapper", {{"color", {"green"}}}}};
  EXPECT_THAT(WantedOf(spec, facts), ElementsAre("the advice mapper:color=blue, mapper:size=10"));
}

TEST(FindUnmet, RequiresExactlyTheAudienceThatWasAskedFor) {
  TokenSpec spec = SpecFor(3600);
  spec.audienceRestriction = {"a", "b"};
  TokenFacts facts = HourFrom();
  facts.audience = {"a", "b"};
  EXPECT_THAT(WantedOf(spec, facts), IsEmpty());
  facts.audience = {"a"};
  EXPECT_THAT(WantedOf(spec, facts), ElementsAre("restriction to the audience a, b; the token is for a"));
  facts.audience = {"a", "b", "c"};
  EXPECT_THAT(WantedOf(spec, facts), ElementsAre("restriction to the audience a, b; the token is for a, b, c"));
}

TEST(FindUnmet, OnBehalfOfAnotherPartyRequiresATokenAboutThatPartyAndNoDelegation) {
  ServiceDialect dialect;
  dialect.delegation = ServiceDialect::Delegation::ON_BEHALF_OF;
  TokenSpec spec = SpecFor(3600);
  spec.delegateTo = "bob@corp.example";
  TokenFacts facts = HourFrom();
  facts.subject = PrincipalId{"Bob", "corp.example"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  facts.subject = PrincipalId{"alice", "corp.example"};
  facts.delegationChain = {{{"bob", "corp.example"}, DateTime()}};
  EXPECT_THAT(WantedOf(spec, facts, dialect),
              ElementsAre("a token about bob@corp.example; the token is about alice@corp.example"));
  EXPECT_THAT(KeysOf(FindUnmet(spec, dialect, ASKED_AT, facts, 0)), ElementsAre("delegation"));
  facts.subject = boost::none;
  EXPECT_THAT(WantedOf(spec, facts, dialect), ElementsAre("a token about bob@corp.example; the token is about nobody"));
  spec.delegateTo = boost::none;
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
}

TEST(FindUnmet, ComparesTheWholeNameOfAnIdentifierThatIsNotSplit) {
  ServiceDialect dialect;
  dialect.delegation = ServiceDialect::Delegation::ON_BEHALF_OF;
  TokenSpec spec = SpecFor(3600);
  spec.delegateTo = "bob@corp.example";
  TokenFacts facts = HourFrom();
  facts.subject = PrincipalId{"bob@corp.example", "nameid:unspecified"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  facts.subject = PrincipalId{"bob", "nameid:unspecified"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), ElementsAre("a token about bob@corp.example; the token is about bob"));
  spec.delegateTo = "bob";
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  spec.delegateTo = "bob@nameid:unspecified";
  EXPECT_THAT(WantedOf(spec, facts, dialect),
              ElementsAre("a token about bob@nameid:unspecified; the token is about bob"));
  // If the token's domain does not begin with "nameid:", the last at-sign separates the name and the domain.
  spec.delegateTo = "a@b";
  facts.subject = PrincipalId{"a@b", "corp.example"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), ElementsAre("a token about a@b; the token is about a@b@corp.example"));
}

TEST(FindUnmet, DoesNotCheckThePartyOfActAs) {
  ServiceDialect dialect;
  dialect.delegation = ServiceDialect::Delegation::ACT_AS;
  TokenSpec spec = SpecFor(3600);
  spec.delegateTo = "bob@corp.example";
  EXPECT_THAT(WantedOf(spec, HourFrom(), dialect), IsEmpty());
}

TEST(FindUnmet, AcceptsARestrictionOfItsOwnForTheAddressThatTheTokenAppliesTo) {
  ServiceDialect dialect;
  dialect.appliesTo = "urn:c";
  TokenSpec spec = SpecFor(3600);
  spec.audienceRestriction = {"urn:a"};
  TokenFacts facts = HourFrom();
  facts.audience = {"(urn:c) and (urn:a)"};
  facts.details.emplace();
  facts.details->audienceRestrictions = {{"urn:c"}, {"urn:a"}};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  const auto unmet = ElementsAre("restriction to the audience urn:a; the token is for (urn:c) and (urn:a)");
  EXPECT_THAT(WantedOf(spec, facts), unmet);
  facts.details->audienceRestrictions = {{"urn:c"}, {"urn:b"}};
  EXPECT_THAT(WantedOf(spec, facts, dialect), unmet);
  facts.details->audienceRestrictions = {{"urn:c"}, {"urn:c"}};
  EXPECT_THAT(WantedOf(spec, facts, dialect), unmet);
}

TEST(FindUnmet, AcceptsARestrictionThatAlsoHasTheAddressThatTheTokenAppliesTo) {
  ServiceDialect dialect;
  dialect.appliesTo = "urn:c";
  TokenSpec spec = SpecFor(3600);
  TokenFacts facts = HourFrom();
  facts.audience = {"urn:c"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  facts.audience = {};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  spec.audienceRestriction = {"urn:a"};
  facts.audience = {"urn:a"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  facts.audience = {"urn:a", "urn:c"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), IsEmpty());
  facts.audience = {"urn:c"};
  EXPECT_THAT(WantedOf(spec, facts, dialect), ElementsAre("restriction to the audience urn:a; the token is for urn:c"));
  facts.audience = {"urn:a", "urn:b"};
  EXPECT_THAT(WantedOf(spec, facts, dialect),
              ElementsAre("restriction to the audience urn:a; the token is for urn:a, urn:b"));
}

struct Life {
  const char *name;
  const char *start;
  const char *end;
  std::int64_t toleranceSec;
  bool isMet; ///< for a lifetime of an hour, asked for at 12:00:00
};

const Life LIVES[] = {
    {"Exact", "2026-01-01T12:00:00Z", "2026-01-01T13:00:00Z", 0, true},
    {"Longer", "2026-01-01T12:00:00Z", "2026-01-01T14:00:00Z", 0, true},
    {"ShorterByAlmostTwoSeconds", "2026-01-01T12:00:01.500Z", "2026-01-01T12:59:58.001Z", 0, true},
    {"ShorterByTwoSeconds", "2026-01-01T12:00:00Z", "2026-01-01T12:59:58Z", 0, false},
    {"ShorterByTwoSecondsDespiteTheTolerance", "2026-01-01T12:00:00Z", "2026-01-01T12:59:58Z", 600, false},
    {"ClockOfTheServiceAheadAndEndAsRequested", "2026-01-01T12:05:00Z", "2026-01-01T13:00:00Z", 0, true},
    {"ClockOfTheServiceAhead", "2026-01-01T12:05:00Z", "2026-01-01T13:05:00Z", 0, true},
    {"ClockOfTheServiceBehindAndEndAsRequested", "2026-01-01T11:50:00Z", "2026-01-01T13:00:00Z", 0, true},
    {"ClockOfTheServiceBehindWithinTheTolerance", "2026-01-01T11:50:00Z", "2026-01-01T12:50:00Z", 600, true},
    {"ClockOfTheServiceBehindByMoreThanTheTolerance", "2026-01-01T11:50:00Z", "2026-01-01T12:50:00Z", 598, false},
    {"OldTokenOfTheSameLength", "2026-01-01T11:30:00Z", "2026-01-01T12:30:00Z", 600, false},
    {"LargeToleranceCountsAsTenMinutes", "2026-01-01T11:30:00Z", "2026-01-01T12:30:00Z", 86400, false},
    {"NegativeToleranceCountsAsZero", "2026-01-01T11:59:59Z", "2026-01-01T12:59:59Z", -3600, true},
    {"Minute", "2026-01-01T12:00:00Z", "2026-01-01T12:01:00Z", 600, false},
};

class FindUnmetLifetime : public testing::TestWithParam<Life> {};

TEST_P(FindUnmetLifetime, IsMetWhenItIsNotClearlyShorter) {
  const Life &life = GetParam();
  const auto unmet =
      FindUnmet(SpecFor(3600), ServiceDialect(), ASKED_AT, HourFrom(life.start, life.end), life.toleranceSec);
  EXPECT_EQ(life.isMet, unmet.empty());
  EXPECT_EQ(life.isMet ? 0u : 1u, unmet.size());
}

INSTANTIATE_TEST_SUITE_P(Of, FindUnmetLifetime, testing::ValuesIn(LIVES),
                         [](const auto &life) { return std::string(life.param.name); });

TEST(FindUnmet, DoesNotOverflowAtTheLimitsOfDates) {
  const TokenFacts facts = HourFrom("0001-01-01T00:00:00Z", "9999-12-31T23:59:59Z");
  EXPECT_THAT(FindUnmet(SpecFor(100LL * 366 * 86400), ServiceDialect(), ASKED_AT, facts, 600), IsEmpty());
}

} // namespace
} // namespace SsoClient::Tool
