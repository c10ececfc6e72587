// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/descriptions.h>

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using Tarvel::System::DateTime;

class DescribedToken final : public SamlToken {
public:
  const std::string &GetId() const override { return id; }
  const DateTime &GetStartDate() const override { return start; }
  const DateTime &GetEndDate() const override { return end; }
  const PrincipalId &GetSubject() const override { return subject; }
  bool IsRenewable() const override { return true; }
  bool IsDelegable() const override { return false; }
  bool IsSolution() const override { return true; }
  ConfirmationType GetConfirmationMethod() const override { return HOLDER_OF_KEY; }
  void GetFullName(std::pair<std::string, std::string> &fullName) const override {
    fullName = {"SECRET-FIRST", "SECRET-LAST"};
  }
  void GetGroups(std::vector<PrincipalId> &all) const override { all = groups; }
  void GetDelegationChain(std::vector<Delegate> &all) const override { all = delegates; }
  void GetAudience(std::set<std::string> &audience) const override { audience = {"SECRET-AUDIENCE"}; }
  void GetAdvice(std::vector<Advice> &advice) const override { advice = {{"SECRET-ADVICE", {}}}; }
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override { return nullptr; }
  const std::string &ToXml() const override { return xml; }

  std::string id = "SECRET-ID";
  std::string xml = "SECRET-XML";
  DateTime start{"2026-01-02T03:04:05Z"};
  DateTime end{"2026-01-02T11:04:05.678Z"};
  PrincipalId subject{"alice", "CORP"};
  std::vector<PrincipalId> groups;
  std::vector<Delegate> delegates;
};

TEST(WriteDelegate, ContainsThePrincipalAndTheTime) {
  const Delegate delegate{{"gateway", "CORP"}, DateTime("2013-05-07T09:03:01.042Z")};
  EXPECT_EQ("{Name: gateway; Domain:CORP} at 2013-05-07T09:03:01.042Z", WriteDelegate(&delegate));
}

TEST(WriteAdviceAttribute, LabelsTheNameAsSource) {
  const AdviceAttribute attribute{"color", {"green", "blue"}};
  EXPECT_EQ("[source=color, attributes=[green, blue]]", WriteAdviceAttribute(&attribute));
  const AdviceAttribute empty{"color", {}};
  EXPECT_EQ("[source=color, attributes=[]]", WriteAdviceAttribute(&empty));
}

TEST(WriteAdvice, JoinsItsAttributes) {
  const Advice advice{"mapper", {{"color", {"green"}}, {"size", {}}}};
  EXPECT_EQ("Advice [source=mapper, attributes=[[source=color, attributes=[green]], [source=size, attributes=[]]]]",
            WriteAdvice(&advice));
}

TEST(AsString, SeparatesElements) {
  const std::vector<std::string> texts{"a", "b", "c"};
  const auto itself = [](const std::string *text) { return *text; };
  EXPECT_EQ("a, b, c", AsString(texts, itself));
  EXPECT_EQ("", AsString(std::vector<std::string>(), itself));
}

TEST(AsString, WritesNoSeparatorAfterEmptyTextsAtTheBeginning) {
  const auto itself = [](const std::string *text) { return *text; };
  EXPECT_EQ("b", AsString(std::vector<std::string>{"", "b"}, itself));
  EXPECT_EQ("c", AsString(std::vector<std::string>{"", "", "c"}, itself));
}

TEST(AsString, WritesTwoSeparatorsForAnEmptyTextInTheMiddle) {
  const auto itself = [](const std::string *text) { return *text; };
  EXPECT_EQ("a, , c", AsString(std::vector<std::string>{"a", "", "c"}, itself));
}

TEST(WriteTokenSpec, WithoutDelegateAudienceAndAdvice) {
  EXPECT_EQ("TokenSpec [tokenLifetimeSec=0, delegable=false, delegateTo=<unset>, renewable=false, "
            "confirmationType=0,audienceRestriction=, advice=[]",
            WriteTokenSpec(TokenSpec()));
}

TEST(WriteTokenSpec, WithEverything) {
  TokenSpec spec;
  spec.tokenLifetimeSec = -28800;
  spec.audienceRestriction = {"https://b/", "https://a/"};
  spec.advice = {{"one", {{"color", {"green"}}}}, {"two", {}}};
  spec.delegable = true;
  spec.delegateTo = std::string("gateway@corp");
  spec.renewable = true;
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  EXPECT_EQ("TokenSpec [tokenLifetimeSec=-28800, delegable=true, delegateTo=gateway@corp, renewable=true, "
            "confirmationType=1,audienceRestriction=https://a/, https://b/, "
            "advice=[Advice [source=one, attributes=[[source=color, attributes=[green]]]], "
            "Advice [source=two, attributes=[]]]",
            WriteTokenSpec(spec));
}

TEST(CreateRedactedDescription, WithoutGroupsAndDelegates) {
  EXPECT_EQ("SamlToken [subject={Name: alice; Domain:CORP}, groups=[], delegationChain=[], "
            "startTime=2026-01-02T03:04:05.000Z, expirationTime=2026-01-02T11:04:05.678Z, renewable=true, "
            "delegable=false, isSolution=true,confirmationType=1]",
            CreateRedactedDescription(DescribedToken()));
}

TEST(CreateRedactedDescription, WithGroupsAndDelegates) {
  DescribedToken token;
  token.groups = {{"Users", "CORP"}, {"Admins", "CORP"}};
  token.delegates = {{{"gateway", "CORP"}, DateTime("2026-01-02T03:04:06Z")},
                     {{"backup", "CORP"}, DateTime("2026-01-02T03:04:07Z")}};
  EXPECT_EQ("SamlToken [subject={Name: alice; Domain:CORP}, "
            "groups=[{Name: Users; Domain:CORP}, {Name: Admins; Domain:CORP}], "
            "delegationChain=[{Name: gateway; Domain:CORP} at 2026-01-02T03:04:06.000Z, "
            "{Name: backup; Domain:CORP} at 2026-01-02T03:04:07.000Z], "
            "startTime=2026-01-02T03:04:05.000Z, expirationTime=2026-01-02T11:04:05.678Z, renewable=true, "
            "delegable=false, isSolution=true,confirmationType=1]",
            CreateRedactedDescription(token));
}

TEST(CreateRedactedDescription, ContainsNothingSecret) {
  EXPECT_EQ(std::string::npos, CreateRedactedDescription(DescribedToken()).find("SECRET"));
}

} // namespace
