// SPDX-License-Identifier: Apache-2.0

#include "token/token_facts.h"

#include "support/parsed_document.h"
#include "support/recorded_deviations.h"
#include "support/throws_message.h"
#include "token/assertion_parser.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using Tarvel::System::DateTime;

constexpr const char *UPN = "http://schemas.xmlsoap.org/claims/UPN";
constexpr const char *GROUP_IDENTITY = SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char *IS_SOLUTION = SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution";
constexpr const char *GIVEN_NAME = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr const char *SUR_NAME = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";

AttributeType Attribute(const std::string &name, const std::vector<std::string> &values) {
  AttributeType attribute;
  attribute.Name = name;
  attribute.values = values;
  return attribute;
}

TEST(SamlAttributeIs, RecognisesTheFourAttributesByTheirWholeName) {
  const std::vector<std::string> names{GROUP_IDENTITY, IS_SOLUTION, GIVEN_NAME, SUR_NAME};
  const auto kinds = [](const std::string &name) {
    const AttributeType attribute = Attribute(name, {});
    return std::vector<bool>{SamlAttributeIsGroupIdentity(attribute), SamlAttributeIsSolution(attribute),
                             SamlAttributeIsGivenName(attribute), SamlAttributeIsSurName(attribute)};
  };
  for (std::size_t index = 0; index < names.size(); ++index) {
    std::vector<bool> expected(names.size(), false);
    EXPECT_EQ(expected, kinds(names[index] + "/"));
    EXPECT_EQ(expected, kinds(names[index].substr(1)));
    expected[index] = true;
    EXPECT_EQ(expected, kinds(names[index]));
  }
}

TEST(ParseGroupIdentity, SplitsAtTheFirstBackslash) {
  const PrincipalId group = ParseGroupIdentity("corp\\admins");
  EXPECT_EQ("admins", group.name);
  EXPECT_EQ("corp", group.domain);
}

TEST(ParseGroupIdentity, KeepsFurtherBackslashesInTheName) {
  const PrincipalId group = ParseGroupIdentity("corp\\admins\\x");
  EXPECT_EQ("admins\\x", group.name);
  EXPECT_EQ("corp", group.domain);
}

TEST(ParseGroupIdentity, RefusesWhenAPartIsMissing) {
  for (const std::string value : {"admins", "\\admins", "corp\\", "\\", ""}) {
    EXPECT_THROWS_MESSAGE(ParseGroupIdentity(value), ParseException,
                          "Failed to parse Group Identity value: `" + value + "'; domain or group missing");
  }
}

TEST(ParseSamlNameId, SplitsAtTheLastAtSign) {
  const PrincipalId alice = ParseSamlNameId({UPN, "alice@corp.example"});
  EXPECT_EQ("alice", alice.name);
  EXPECT_EQ("corp.example", alice.domain);
  const PrincipalId twoAtSigns = ParseSamlNameId({UPN, "alice@home@corp.example"});
  EXPECT_EQ("alice@home", twoAtSigns.name);
  EXPECT_EQ("corp.example", twoAtSigns.domain);
}

TEST(ParseSamlNameId, RefusesOtherFormats) {
  for (const std::string format :
       {"", "urn:oasis:names:tc:SAML:2.0:nameid-format:persistent", "http://schemas.xmlsoap.org/claims/upn"}) {
    EXPECT_THROWS_MESSAGE(ParseSamlNameId({format, "alice@corp"}), ParseException,
                          "Invalid or unsupported NameId format '" + format + "'");
  }
}

TEST(ParseSamlNameId, RefusesWhenAPartIsMissing) {
  for (const std::string value : {"alice", "@corp", "alice@", "@", "", "alice@corp@"}) {
    EXPECT_THROWS_MESSAGE(ParseSamlNameId({UPN, value}), ParseException,
                          "Failed to parse the UPN NameID: `" + value + "'; name or domain part is missing.");
  }
}

TEST(ParseIsSolutionAttribute, IsTrueForTrueInAnyLetterCaseOnly) {
  for (const std::string value : {"true", "TRUE", "True"}) {
    EXPECT_TRUE(ParseIsSolutionAttribute(Attribute(IS_SOLUTION, {value}))) << value;
  }
  for (const std::string value : {"false", "1", "yes", "true ", ""}) {
    EXPECT_FALSE(ParseIsSolutionAttribute(Attribute(IS_SOLUTION, {value}))) << value;
  }
}

TEST(ParseIsSolutionAttribute, RefusesNoValueAndSeveral) {
  EXPECT_THROWS_MESSAGE(ParseIsSolutionAttribute(Attribute(IS_SOLUTION, {})), ParseException,
                        "No value found for attribute isSolution.");
  EXPECT_THROWS_MESSAGE(ParseIsSolutionAttribute(Attribute(IS_SOLUTION, {"true", "true"})), ParseException,
                        "More than one value found for attribute isSolution.");
}

TEST(ParsePrincipalNameAttribute, IsTheFirstValueOrEmpty) {
  EXPECT_EQ("Alice", ParsePrincipalNameAttribute(Attribute(GIVEN_NAME, {"Alice", "Bob"})));
  EXPECT_EQ("", ParsePrincipalNameAttribute(Attribute(GIVEN_NAME, {})));
}

TEST(ParseToDelegate, HasNameAndInstant) {
  const Delegate delegate = ParseToDelegate({DateTime("2026-01-01T00:00:01Z"), {UPN, "gateway@corp"}});
  EXPECT_EQ((PrincipalId{"gateway", "corp"}), delegate.subject);
  EXPECT_EQ(DateTime("2026-01-01T00:00:01Z"), delegate.delegationInstant);
  EXPECT_THROW(ParseToDelegate({DateTime(), {"urn:other", "gateway@corp"}}), ParseException);
}

SamlAssertionType Minimal() {
  SamlAssertionType assertion;
  assertion.ID = "_1";
  assertion.Subject.NameID = {UPN, "alice@corp"};
  return assertion;
}

TokenFacts FactsWith(const std::vector<AttributeType> &attributes) {
  SamlAssertionType assertion = Minimal();
  assertion.AttributeStatement = AttributeStatementType{attributes};
  return TakeTokenFacts(std::move(assertion));
}

TEST(TakeTokenFacts, HasNoGroupsNamesOrSolutionWithoutAttributeStatement) {
  const TokenFacts facts = TakeTokenFacts(Minimal());
  EXPECT_TRUE(facts.groups.empty());
  EXPECT_EQ((std::pair<std::string, std::string>()), facts.fullName);
  EXPECT_FALSE(facts.solution);
}

TEST(TakeTokenFacts, AppendsGroupsInOrderOverAllAttributes) {
  const TokenFacts facts =
      FactsWith({Attribute(GROUP_IDENTITY, {"corp\\b", "corp\\a"}), Attribute(GROUP_IDENTITY, {"branch\\c"})});
  ASSERT_EQ(3u, facts.groups.size());
  EXPECT_EQ("{Name: b; Domain:corp}", facts.groups[0].ToString());
  EXPECT_EQ("{Name: a; Domain:corp}", facts.groups[1].ToString());
  EXPECT_EQ("{Name: c; Domain:branch}", facts.groups[2].ToString());
}

TEST(TakeTokenFacts, LetsALaterNameOrSolutionAttributeReplaceTheEarlierOne) {
  const TokenFacts facts = FactsWith({Attribute(GIVEN_NAME, {"Alice"}), Attribute(SUR_NAME, {"Liddell"}),
                                      Attribute(IS_SOLUTION, {"true"}), Attribute(GIVEN_NAME, {"Alicia", "ignored"}),
                                      Attribute(SUR_NAME, {}), Attribute(IS_SOLUTION, {"false"})});
  EXPECT_EQ((std::pair<std::string, std::string>("Alicia", "")), facts.fullName);
  EXPECT_FALSE(facts.solution);
}

TEST(TakeTokenFacts, IgnoresOtherAttributes) {
  const TokenFacts facts = FactsWith({Attribute("urn:other", {"no group", "true"}), Attribute("", {})});
  EXPECT_TRUE(facts.groups.empty());
  EXPECT_FALSE(facts.solution);
}

TEST(TakeTokenFacts, IsRenewableOnlyWithACountThatIsNotZero) {
  const auto isRenewable = [](const boost::optional<RenewRestrictionType> &restriction) {
    SamlAssertionType assertion = Minimal();
    assertion.Conditions.RenewRestriction = restriction;
    return TakeTokenFacts(std::move(assertion)).renewable;
  };
  EXPECT_FALSE(isRenewable(boost::none));
  EXPECT_FALSE(isRenewable(RenewRestrictionType{boost::none}));
  EXPECT_FALSE(isRenewable(RenewRestrictionType{std::uint64_t{0}}));
  EXPECT_TRUE(isRenewable(RenewRestrictionType{std::uint64_t{5}}));
}

TEST(TakeTokenFacts, IsDelegableOnlyWithACountThatIsNotZero) {
  const auto isDelegable = [](const boost::optional<ProxyRestrictionType> &restriction) {
    SamlAssertionType assertion = Minimal();
    assertion.Conditions.ProxyRestriction = restriction;
    return TakeTokenFacts(std::move(assertion)).delegable;
  };
  EXPECT_FALSE(isDelegable(boost::none));
  EXPECT_FALSE(isDelegable(ProxyRestrictionType{boost::none}));
  EXPECT_FALSE(isDelegable(ProxyRestrictionType{std::uint64_t{0}}));
  EXPECT_TRUE(isDelegable(ProxyRestrictionType{std::uint64_t{1}}));
}

TEST(TakeAttributes, LeavesOutWhatCannotBeReadAndReportsIt) {
  SamlAssertionType assertion = Minimal();
  assertion.AttributeStatement =
      AttributeStatementType{{Attribute(GROUP_IDENTITY, {"corp\\a", "b", "corp\\c", "d"}),
                              Attribute(IS_SOLUTION, {"true"}), Attribute(IS_SOLUTION, {"false", "false"})}};
  Testing::RecordedDeviations sink;
  TokenFacts facts;
  TakeAttributes(assertion, facts, sink);
  ASSERT_EQ(2u, facts.groups.size());
  EXPECT_EQ("c", facts.groups[1].name);
  EXPECT_TRUE(facts.solution);
  ASSERT_EQ(3u, sink.all.size());
  EXPECT_EQ("Failed to parse Group Identity value: `b'; domain or group missing", sink.all[0].message);
  EXPECT_EQ("b", sink.all[0].found);
  EXPECT_EQ("Failed to parse Group Identity value: `d'; domain or group missing", sink.all[1].message);
  EXPECT_EQ("More than one value found for attribute isSolution.", sink.all[2].message);
}

TEST(TakeAttributes, MakesNoTextsForAFullSink) {
  SamlAssertionType assertion = Minimal();
  assertion.AttributeStatement = AttributeStatementType{{Attribute(GROUP_IDENTITY, {"a", "b", "c"})}};
  Testing::RecordedDeviations sink(1);
  TokenFacts facts;
  TakeAttributes(assertion, facts, sink);
  EXPECT_EQ(1u, sink.all.size());
  EXPECT_EQ(2u, sink.unlisted);
}

TEST(TakeConditions, LeavesOutDelegatesThatCannotBeReadAndReportsThem) {
  ConditionsType conditions;
  conditions.DelegationRestriction = DelegationRestrictionType{
      {{DateTime(), {UPN, "gateway@corp"}}, {DateTime(), {"urn:other", "x"}}, {DateTime(), {UPN, "backup@corp"}}}};
  Testing::RecordedDeviations sink;
  TokenFacts facts;
  TakeConditions(conditions, facts, sink);
  ASSERT_EQ(2u, facts.delegationChain.size());
  EXPECT_EQ("backup", facts.delegationChain[1].subject.name);
  ASSERT_EQ(1u, sink.all.size());
  EXPECT_EQ("Invalid or unsupported NameId format 'urn:other'", sink.all[0].message);
  EXPECT_EQ("Format", sink.all[0].attribute);
}

TEST(TakeSubject, KeepsNoNameThatCannotBeRead) {
  SamlAssertionType assertion = Minimal();
  assertion.Subject.NameID.value = "alice";
  Testing::RecordedDeviations sink;
  TokenFacts facts;
  TakeSubject(assertion, facts, sink);
  EXPECT_EQ(PrincipalId(), facts.subject);
  EXPECT_EQ("_1", facts.id);
  EXPECT_EQ(1u, sink.all.size());
}

} // namespace
