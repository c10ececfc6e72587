// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_report.h>

#include "support/throws_message.h"
#include "unit/token/explained_token.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <utility>

namespace {

using namespace SsoClient;
using namespace Testing;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

/// Whether a report of this kind of expression returns its checks.
template <typename Report>
concept ReturnsChecks = requires(Report &&report) {
  std::forward<Report>(report).Get(Check::FORM);
  std::forward<Report>(report).FirstFailed();
};

static_assert(ReturnsChecks<TokenReport &>);
static_assert(ReturnsChecks<const TokenReport &>);
static_assert(!ReturnsChecks<TokenReport>, "the checks of a temporary report end with it");

TokenReport WithOneFinding() {
  TokenReport report;
  report.refusal = "bad\x1b[2J";
  report.checks.resize(3);
  report.checks[0] = {Check::WELL_FORMED, Outcome::PASSED, "It is XML.", {}, 0};
  report.checks[1] = {Check::REQUIRED_CONFIRMATION, Outcome::FAILED, "Something failed.", {}, 4};
  TokenReport::Finding finding;
  finding.message = "bad";
  finding.path = "/a/b";
  finding.attribute = "c";
  finding.line = 3;
  finding.column = 14;
  finding.wanted = "good";
  finding.found = "nothing";
  finding.missedBySec = 5;
  finding.remedy = "Do it.";
  report.checks[1].findings = {finding, {}};
  report.checks[1].findings[1].message = "worse";
  report.checks[2] = {Check::NAMES, Outcome::NOT_DONE, "There is none.", {}, 0};
  return report;
}

TEST(TokenReport, GetsACheckAndTheFirstFailedOne) {
  const TokenReport report = WithOneFinding();
  EXPECT_EQ(&report.checks[2], &report.Get(Check::NAMES));
  EXPECT_EQ(&report.checks[1], report.FirstFailed());
  const TokenReport empty;
  EXPECT_EQ(nullptr, empty.FirstFailed());
}

TEST(TokenReport, ThrowsForACheckThatItDoesNotHave) {
  const TokenReport report = WithOneFinding();
  EXPECT_THROWS_MESSAGE(report.Get(Check::FORM), Tarvel::InvalidArgumentException,
                        "Invalid argument : the report has no check of number 1");
}

TEST(GetCheckName, IsInLowerCaseWithHyphensAndDifferentForEachCheck) {
  std::set<std::string> names;
  for (int check = 0; check <= static_cast<int>(Check::REQUIRED_CONFIRMATION); ++check) {
    const std::string name = GetCheckName(static_cast<Check>(check));
    EXPECT_EQ(std::string::npos, name.find_first_not_of("abcdefghijklmnopqrstuvwxyz-")) << name;
    names.insert(name);
  }
  EXPECT_EQ(14u, names.size());
  EXPECT_STREQ("well-formed", GetCheckName(Check::WELL_FORMED));
  EXPECT_STREQ("required-confirmation", GetCheckName(Check::REQUIRED_CONFIRMATION));
  EXPECT_STREQ("unknown", GetCheckName(static_cast<Check>(14)));
}

TEST(GetOutcomeName, IsOneOfThree) {
  EXPECT_STREQ("passed", GetOutcomeName(Outcome::PASSED));
  EXPECT_STREQ("failed", GetOutcomeName(Outcome::FAILED));
  EXPECT_STREQ("not done", GetOutcomeName(Outcome::NOT_DONE));
  EXPECT_STREQ("unknown", GetOutcomeName(static_cast<Outcome>(3)));
}

TEST(WriteTokenReport, HasALineForEachCheckAndSomeForEachFinding) {
  EXPECT_EQ("The token is refused: bad\\u001B[2J\n"
            "well-formed            passed    It is XML.\n"
            "required-confirmation  failed    Something failed.\n"
            "    bad\n"
            "      at: /a/b/@c, line 3, column 14\n"
            "      wanted: good\n"
            "      found: nothing\n"
            "      missed by: 5 s\n"
            "      what to do: Do it.\n"
            "    worse\n"
            "    and 4 more\n"
            "names                  not done  There is none.\n",
            WriteTokenReport(WithOneFinding()));
}

TEST(WriteTokenReport, BeginsWithTheVerdict) {
  TokenReport report;
  report.accepted = true;
  EXPECT_EQ("The token is accepted.\n", WriteTokenReport(report));
}

using WriteTokenReportOfAToken = ExplainedTokenTest;

TEST_F(WriteTokenReportOfAToken, IsPrintableForHostileTexts) {
  const std::string hostile = "\u202e\u2066\u0085\u200f";
  std::string token = ReplaceOnce(TokenFixture("bearer"), ">alice@corp.example<", ">" + hostile + "<");
  token = ReplaceOnce(token, ">https://mail.corp.example/<", ">" + hostile + "<");
  token = ReplaceOnce(token, "<saml:AuthnContext>", "<saml:AuthnContext x" + std::string("=\"") + hostile + "\">");
  VerifyOptions options;
  options.acceptedAudiences = {hostile + "\x1b[31m\n"};
  const std::string text = WriteTokenReport(Explain(token, options));
  EXPECT_EQ(std::string::npos, text.find(hostile.substr(0, 3))) << text;
  std::string lines;
  for (const char character : text) {
    lines += character == '\n' ? ' ' : character;
  }
  EXPECT_EQ(Tarvel::StringUtil::Printable(lines), lines);
}

} // namespace
