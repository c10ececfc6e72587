// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_facts.h"

#include "support/recorded_deviations.h"
#include "support/throws_message.h"
#include "token/saml2_checks.h"
#include "unit/token/saml2_records.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

const std::string UPN = "http://schemas.xmlsoap.org/claims/UPN";
const std::string SAML11_FORMAT = "urn:oasis:names:tc:SAML:1.1:nameid-format:";
const std::string SAML20_FORMAT = "urn:oasis:names:tc:SAML:2.0:nameid-format:";

using MaybeText = boost::optional<std::string>;

NameId Named(const std::string &value, const MaybeText &format, const MaybeText &qualifier = boost::none,
             const MaybeText &spQualifier = boost::none) {
  return {value, format, qualifier, spQualifier, boost::none};
}

std::string PrincipalOf(const NameId &nameId) {
  const PrincipalId principal = ToPrincipalId(nameId);
  return principal.name + " | " + principal.domain;
}

TEST(ToPrincipalId, SplitsAUserPrincipalNameWithoutQualifiersAtItsLastAtSign) {
  EXPECT_EQ("alice | corp", PrincipalOf(Named("alice@corp", UPN)));
  EXPECT_EQ("alice@home | CORP.example", PrincipalOf(Named("alice@home@CORP.example", UPN)));
}

TEST(ToPrincipalId, KeepsAUserPrincipalNameWithoutANameOrADomainWhole) {
  for (const std::string value : {"alice", "@corp", "alice@", "@"}) {
    EXPECT_EQ(value + " | nameid:upn", PrincipalOf(Named(value, UPN)));
  }
}

TEST(ToPrincipalId, KeepsAUserPrincipalNameWithAQualifierWhole) {
  EXPECT_EQ("alice@corp | nameid:upn;name-qualifier=q", PrincipalOf(Named("alice@corp", UPN, std::string("q"))));
  EXPECT_EQ("alice@corp | nameid:upn;sp-name-qualifier=q",
            PrincipalOf(Named("alice@corp", UPN, boost::none, std::string("q"))));
}

// Otherwise a user principal name could have the same principal as a name of another format.
TEST(ToPrincipalId, KeepsAUserPrincipalNameWholeIfItsDomainLooksLikeAFormat) {
  for (const std::string domain : {"nameid:persistent", "nameid:", "NameID:persistent",
                                   "name\xC4\xB1"
                                   "d:persistent"}) {
    EXPECT_EQ("alice@" + domain + " | nameid:upn", PrincipalOf(Named("alice@" + domain, UPN)));
  }
  EXPECT_EQ("alice | nameid", PrincipalOf(Named("alice@nameid", UPN)));
  EXPECT_EQ("alice | xnameid:persistent", PrincipalOf(Named("alice@xnameid:persistent", UPN)));
}

TEST(ToPrincipalId, WritesEachFormatOfTheStandardAsItsKey) {
  const std::vector<std::pair<std::string, std::string>> formats{
      {SAML11_FORMAT + "unspecified", "unspecified"},
      {SAML11_FORMAT + "emailAddress", "email"},
      {SAML11_FORMAT + "X509SubjectName", "x509-subject"},
      {SAML11_FORMAT + "WindowsDomainQualifiedName", "windows"},
      {SAML20_FORMAT + "kerberos", "kerberos"},
      {SAML20_FORMAT + "entity", "entity"},
      {SAML20_FORMAT + "persistent", "persistent"},
      {SAML20_FORMAT + "transient", "transient"}};
  for (const auto &[format, key] : formats) {
    for (const std::string value : {"alice", "alice@corp", "CORP\\alice", "CN=Alice, O=Corp", "\xC3\xA4"}) {
      EXPECT_EQ(value + " | nameid:" + key, PrincipalOf(Named(value, format)));
    }
  }
  EXPECT_EQ("alice@corp | nameid:unspecified", PrincipalOf(Named("alice@corp", boost::none)));
}

TEST(ToPrincipalId, WritesEveryOtherFormatAsItsEncodedUri) {
  EXPECT_EQ("alice | nameid:format=urn:format-1_2.3~4/5",
            PrincipalOf(Named("alice", std::string("urn:format-1_2.3~4/5"))));
  EXPECT_EQ("alice | nameid:format=%55%52%4E:a%3Bb%3Dc%25d%20%C3%A4%40%5C",
            PrincipalOf(Named("alice", std::string("URN:a;b=c%d \xC3\xA4@\\"))));
  EXPECT_EQ("alice | nameid:format=urn:oasis:names:tc:%53%41%4D%4C:2.0:nameid-format:unspecified",
            PrincipalOf(Named("alice", SAML20_FORMAT + "unspecified")));
}

TEST(ToPrincipalId, WritesTheQualifiersEncoded) {
  EXPECT_EQ("a | nameid:persistent;name-qualifier=https://idp/%3Bx;sp-name-qualifier=%53p",
            PrincipalOf(Named("a", SAML20_FORMAT + "persistent", std::string("https://idp/;x"), std::string("Sp"))));
  EXPECT_EQ("a | nameid:unspecified;sp-name-qualifier=s",
            PrincipalOf(Named("a", boost::none, boost::none, std::string("s"))));
}

TEST(ToPrincipalId, IgnoresTheProvidedId) {
  NameId nameId = Named("a", boost::none);
  nameId.spProvidedId = std::string("b");
  EXPECT_EQ("a | nameid:unspecified", PrincipalOf(nameId));
}

/// Values, qualifiers and formats that look like parts of other principals.
std::vector<std::string> TrickyTexts() {
  return {"a",
          "b",
          "a@b",
          "@",
          "a@",
          "@b",
          "a@b@c",
          "a;name-qualifier=b",
          ";",
          "%",
          "=",
          "%3B",
          ";name-qualifier=",
          ";sp-name-qualifier=a",
          "a;sp-name-qualifier=a",
          "nameid:",
          "nameid:unspecified",
          "nameid:upn",
          "a@nameid:upn",
          "a@nameid:unspecified",
          "a@nameid:unspecified;name-qualifier=a",
          "a@nameid:format=a",
          "format=a",
          "format=%41",
          "CORP\\a",
          "\\",
          "\\a",
          "\xC3\xA4",
          "\xC3\x9F",
          "ss",
          "upn",
          "unspecified",
          "persistent",
          " a",
          "a "};
}

/// Formats and qualifiers. Some differ only by letter case, which counts in formats and qualifiers.
std::vector<MaybeText> TrickyAttributes() {
  std::vector<MaybeText> texts{boost::none,
                               std::string("A"),
                               std::string("%3b"),
                               std::string("UPN"),
                               std::string("\xC3\x84"),
                               UPN,
                               std::string("HTTP://schemas.xmlsoap.org/claims/upn"),
                               SAML11_FORMAT + "emailAddress",
                               SAML11_FORMAT + "emailaddress",
                               SAML20_FORMAT + "persistent",
                               SAML20_FORMAT + "unspecified"};
  for (const std::string &text : TrickyTexts()) {
    texts.emplace_back(text);
  }
  return texts;
}

// Tries each value with each format: without qualifiers, with each qualifier in either place, and with two qualifiers.
TEST(ToPrincipalId, ReturnsDifferentPrincipalsForIdentifiersThatDifferByMoreThanLetterCaseOfTheValue) {
  std::set<PrincipalId, PrincipalIdLess> principals;
  std::size_t identifiers = 0;
  const auto add = [&](const NameId &nameId) {
    ++identifiers;
    EXPECT_TRUE(principals.insert(ToPrincipalId(nameId)).second) << PrincipalOf(nameId);
  };
  for (const std::string &value : TrickyTexts()) {
    for (const MaybeText &format : TrickyAttributes()) {
      add(Named(value, format));
      for (const MaybeText &qualifier : TrickyAttributes()) {
        if (qualifier) {
          add(Named(value, format, qualifier));
          add(Named(value, format, boost::none, qualifier));
          add(Named(value, format, qualifier, std::string("a")));
        }
      }
    }
  }
  EXPECT_EQ(principals.size(), identifiers);
  EXPECT_LT(200000u, identifiers);
}

TEST(ToPrincipalId, ReturnsEqualPrincipalsForValuesThatDifferByLetterCaseOnly) {
  const PrincipalId mixed = ToPrincipalId(Named("aB", SAML20_FORMAT + "persistent"));
  EXPECT_EQ(ToPrincipalId(Named("Ab", SAML20_FORMAT + "persistent")), mixed);
  EXPECT_EQ("aB", mixed.name);
}

TEST(IsSameIdentifier, ComparesValueFormatAndQualifiersByOctet) {
  EXPECT_TRUE(IsSameIdentifier(SUBJECT, SUBJECT));
  for (const NameId &other : IdentifiersThatDifferFrom(SUBJECT)) {
    EXPECT_FALSE(IsSameIdentifier(SUBJECT, other));
    EXPECT_FALSE(IsSameIdentifier(other, SUBJECT));
  }
  EXPECT_TRUE(IsSameIdentifier(Named("a", boost::none), Named("a", SAML11_FORMAT + "unspecified")));
  EXPECT_FALSE(IsSameIdentifier(Named("a", boost::none), Named("a", SAML20_FORMAT + "unspecified")));
}

std::set<std::string> CommonOf(std::vector<std::set<std::string>> restrictions) {
  return TakeCommonAudiences(std::move(restrictions));
}

TEST(TakeCommonAudiences, IsTheIntersectionOfAllRestrictions) {
  using Audiences = std::set<std::string>;
  EXPECT_EQ(Audiences(), CommonOf({}));
  EXPECT_EQ((Audiences{"urn:a", "urn:b"}), CommonOf({{"urn:b", "urn:a"}}));
  EXPECT_EQ((Audiences{"urn:a", "urn:c"}), CommonOf({{"urn:a", "urn:b", "urn:c"}, {"urn:c", "urn:a"}}));
  EXPECT_EQ((Audiences{"urn:a", "urn:c"}), CommonOf({{"urn:c", "urn:a"}, {"urn:a", "urn:b", "urn:c"}}));
  EXPECT_EQ(Audiences{"urn:b"}, CommonOf({{"urn:a", "urn:b"}, {"urn:b", "urn:c", "urn:d"}, {"urn:b", "urn:a"}}));
}

TEST(TakeCommonAudiences, WritesAllRestrictionsInOneTextIfNoAudienceIsInAllOfThem) {
  using Audiences = std::set<std::string>;
  EXPECT_EQ(Audiences{"(urn:a) and (urn:b)"}, CommonOf({{"urn:a"}, {"urn:b"}}));
  EXPECT_EQ(Audiences{"(urn:a, urn:b) and (urn:c) and (urn:a)"}, CommonOf({{"urn:b", "urn:a"}, {"urn:c"}, {"urn:a"}}));
  EXPECT_EQ(Audiences{"(urn:c) and (urn:a, urn:b)"}, CommonOf({{"urn:c"}, {"urn:b", "urn:a"}}));
}

/// Chooses the confirmation, and returns the facts of the assertion.
TokenFacts FactsOfAssertion(Saml2Assertion assertion) {
  VerifyOptions options;
  options.clockToleranceSec = 1000000;
  EXPECT_TRUE(ChooseConfirmation(assertion, options, AtSecond(0), ThrowingSink()));
  return TakeSaml2Facts(assertion);
}

Saml2Assertion WithAttribute(const std::string &name, const std::vector<std::string> &values) {
  Saml2Assertion assertion = AssertionWith({Bearer()});
  assertion.common.AttributeStatement.emplace();
  AttributeType &attribute = assertion.common.AttributeStatement->attributes.emplace_back();
  attribute.Name = name;
  attribute.values = values;
  return assertion;
}

constexpr const char *GROUP = SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char *SOLUTION = SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution";

TEST(TakeSaml2Facts, ReturnsIdentifierSubjectAndConfirmation) {
  Saml2Assertion assertion = AssertionWith({HolderOfKey()});
  assertion.common.Conditions.RenewRestriction = RenewRestrictionType{1};
  assertion.common.Conditions.ProxyRestriction = ProxyRestrictionType{1};
  const TokenFacts facts = FactsOfAssertion(assertion);
  EXPECT_EQ("_1", facts.id);
  EXPECT_EQ("{Name: alice; Domain:nameid:format=urn:format;name-qualifier=urn:qualifier;sp-name-qualifier=urn:sp}",
            facts.subject.ToString());
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, facts.confirmationMethod);
  EXPECT_EQ(assertion.details.confirmations[0].certificate, facts.confirmationCertificate);
  EXPECT_TRUE(facts.renewable);
  EXPECT_TRUE(facts.delegable);
}

TEST(TakeSaml2Facts, IsNeitherRenewableNorDelegableWithoutACountThatAllowsAUse) {
  for (const boost::optional<std::uint64_t> &count :
       {boost::optional<std::uint64_t>(), boost::make_optional<std::uint64_t>(0)}) {
    Saml2Assertion assertion = AssertionWith({Bearer()});
    EXPECT_FALSE(FactsOfAssertion(assertion).renewable);
    EXPECT_FALSE(FactsOfAssertion(assertion).delegable);
    assertion.common.Conditions.RenewRestriction = RenewRestrictionType{count};
    assertion.common.Conditions.ProxyRestriction = ProxyRestrictionType{count};
    EXPECT_FALSE(FactsOfAssertion(assertion).renewable);
    EXPECT_FALSE(FactsOfAssertion(assertion).delegable);
  }
}

TEST(TakeSaml2Facts, HasNoCertificateForABearerOrForAHolderOfKeyWithOnlyAKey) {
  Confirmation keyOnly = HolderOfKey();
  keyOnly.details.certificate = nullptr;
  EXPECT_EQ(nullptr, FactsOfAssertion(AssertionWith({keyOnly})).confirmationCertificate);
  Confirmation bearer = Bearer();
  bearer.details.certificate = HolderOfKey().details.certificate;
  const TokenFacts facts = FactsOfAssertion(AssertionWith({HolderOfKey(), bearer}));
  EXPECT_EQ(SamlToken::BEARER, facts.confirmationMethod);
  EXPECT_EQ(nullptr, facts.confirmationCertificate);
}

TEST(TakeSaml2Facts, HasTheDatesWithinWhichTheTokenCanBeUsed) {
  Saml2Assertion assertion = WithSessions({AtSecond(3000)});
  Put(assertion, {Bearer().From(AtSecond(-5)).Until(AtSecond(4000))});
  TokenFacts facts = FactsOfAssertion(assertion);
  EXPECT_EQ(AtSecond(-5), facts.startDate);
  EXPECT_EQ(AtSecond(3000), facts.endDate);
  facts = FactsOfAssertion(AssertionWith({Bearer()}));
  EXPECT_EQ(AtSecond(-3600), facts.startDate);
  EXPECT_EQ(AtSecond(3600), facts.endDate);
}

TEST(TakeSaml2Facts, ReturnsEachDelegateWithItsQualifiers) {
  Saml2Assertion assertion = Delegated({}, {SUBJECT, DELEGATE});
  assertion.common.Conditions.DelegationRestriction->delegates[0].DelegationInstant = AtSecond(1);
  const TokenFacts facts = FactsOfAssertion(assertion);
  ASSERT_EQ(2u, facts.delegationChain.size());
  EXPECT_EQ(ToPrincipalId(SUBJECT), facts.delegationChain[0].subject);
  EXPECT_EQ(AtSecond(1), facts.delegationChain[0].delegationInstant);
  EXPECT_EQ(ToPrincipalId(DELEGATE), facts.delegationChain[1].subject);
}

TEST(TakeSaml2Facts, LeavesOutADelegateWithoutAName) {
  Saml2Assertion assertion = Delegated({}, {SUBJECT, DELEGATE});
  assertion.common.Conditions.DelegationRestriction->delegates[0].NameID = NameIDType();
  const TokenFacts facts = FactsOfAssertion(assertion);
  ASSERT_EQ(1u, facts.delegationChain.size());
  EXPECT_EQ(ToPrincipalId(DELEGATE), facts.delegationChain[0].subject);
}

TEST(TakeSaml2Facts, ReturnsGroupsWithAndWithoutADomain) {
  const TokenFacts facts = FactsOfAssertion(WithAttribute(GROUP, {"users", "CORP\\admins", "a@b", "A\\B\\C"}));
  std::vector<std::string> groups;
  for (const PrincipalId &group : facts.groups) {
    groups.push_back(group.ToString());
  }
  EXPECT_EQ((std::vector<std::string>{"{Name: users; Domain:}", "{Name: admins; Domain:CORP}", "{Name: a@b; Domain:}",
                                      "{Name: B\\C; Domain:A}"}),
            groups);
}

TEST(TakeSaml2Facts, RefusesAnEmptyGroupAndABackslashWithoutDomainOrName) {
  for (const std::string value : {"", "\\", "\\users", "CORP\\"}) {
    EXPECT_THROWS_MESSAGE(FactsOfAssertion(WithAttribute(GROUP, {"fine", value})), ParseException,
                          "Failed to parse Group Identity value: `" + value + "'; domain or group missing");
  }
}

TEST(TakeAttributes, RefusesAGroupWithoutADomain) {
  SamlAssertionType assertion = std::move(WithAttribute(GROUP, {"users"}).common);
  TokenFacts facts;
  EXPECT_THROWS_MESSAGE(TakeAttributes(assertion, facts, ThrowingSink()), ParseException,
                        "Failed to parse Group Identity value: `users'; domain or group missing");
}

TEST(TakeSaml2Facts, ReadsTheSolutionAttributeLikeTheProfileStrict) {
  EXPECT_TRUE(FactsOfAssertion(WithAttribute(SOLUTION, {"True"})).solution);
  EXPECT_FALSE(FactsOfAssertion(WithAttribute(SOLUTION, {"1"})).solution);
  EXPECT_THROWS_MESSAGE(FactsOfAssertion(WithAttribute(SOLUTION, {})), ParseException,
                        "No value found for attribute isSolution.");
  EXPECT_THROWS_MESSAGE(FactsOfAssertion(WithAttribute(SOLUTION, {"true", "true"})), ParseException,
                        "More than one value found for attribute isSolution.");
}

TEST(TakeSaml2Attributes, LeavesOutWhatCannotBeReadAndReportsIt) {
  Saml2Assertion assertion = WithAttribute(GROUP, {"\\", "users"});
  TokenFacts facts;
  RecordedDeviations sink;
  TakeSaml2Attributes(assertion, facts, sink);
  ASSERT_EQ(1u, sink.all.size());
  ASSERT_EQ(1u, facts.groups.size());
  EXPECT_EQ("users", facts.groups[0].name);
}

} // namespace
