// SPDX-License-Identifier: Apache-2.0
// The other tests in this folder are useful only if they notice wrong reports. Here, right reports get one wrong change
// each.

#include "verifiers.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/printable_text.h"
#include "support/report_places.h"
#include "support/report_rules.h"
#include "xml/xml_text.h"

#include <tarvel/xml/document.h>

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <utility>

namespace Reports {
namespace {

using SsoClient::TokenReport;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

TokenReport::CheckResult &ResultOf(TokenReport &report, Check check) {
  return report.checks[static_cast<std::size_t>(check)];
}

TokenReport::Finding &FirstFinding(TokenReport &report, Check check) {
  return ResultOf(report, check).findings.front();
}

const std::string ACCEPTED = "tokens/full.xml";
const std::string CHANGED = "attacks/digest-resigned-first-bit.xml";
const std::string SYNTAX = "attacks/entity-undefined.xml";
const std::string FORM = "attacks/unsigned.xml";
const std::string EXPIRED = "tokens/expired.xml";

struct WrongChange {
  const char *name;
  const std::string &file; // the report on it is changed
  std::function<void(TokenReport &)> change;
  const char *noticed; // the beginning of what must be noticed
};

const WrongChange CHANGES[] = {
    {"AcceptedAlthoughRefused", CHANGED, [](auto &report) { report.accepted = true; }, "accepts what Verify refuses"},
    {"RefusedAlthoughAccepted", ACCEPTED, [](auto &report) { report.accepted = false; },
     "a refusal of what Verify accepts"},
    {"RefusalIsCut", CHANGED, [](auto &report) { report.refusal.pop_back(); }, "the refusal is: "},
    {"MessageIsCut", CHANGED, [](auto &report) { FirstFinding(report, Check::DIGESTS).message.pop_back(); },
     "the first finding is: "},
    {"AnExtraFindingComesFirst", FORM,
     [](auto &report) {
       auto &findings = ResultOf(report, Check::FORM).findings;
       findings.insert(findings.begin(), findings.front());
       findings.front().message = "extra";
     },
     "the first finding is: extra"},
    {"ACheckIsLeftOut", ACCEPTED, [](auto &report) { report.checks.pop_back(); }, "there are 13 checks"},
    {"ChecksAreInAnotherOrder", ACCEPTED, [](auto &report) { std::swap(report.checks[3], report.checks[4]); },
     "confirmation is at position 3"},
    {"AFailedCheckHasNoFinding", CHANGED, [](auto &report) { ResultOf(report, Check::DIGESTS).findings.clear(); },
     "it is refused, but there is no finding"},
    {"APassedCheckHasAFinding", CHANGED,
     [](auto &report) { ResultOf(report, Check::DIGESTS).outcome = Outcome::PASSED; }, "accepted and the outcomes"},
    {"ACheckIsNotDoneWithoutReason", ACCEPTED,
     [](auto &report) { ResultOf(report, Check::NAMES).outcome = Outcome::NOT_DONE; },
     "names is not done although none has failed"},
    {"ACheckFailsThatCannot", FORM,
     [](auto &report) {
       std::swap(ResultOf(report, Check::FORM).outcome, ResultOf(report, Check::SIGNATURE).outcome);
       std::swap(ResultOf(report, Check::FORM).findings, ResultOf(report, Check::SIGNATURE).findings);
     },
     "signature fails, but Verify throws ParseException"},
    {"ACheckHasNoSummary", ACCEPTED, [](auto &report) { ResultOf(report, Check::KEYS).summary.clear(); },
     "keys has no summary"},
    {"FindingsAreLeftOutWithoutNeed", FORM, [](auto &report) { ++ResultOf(report, Check::FORM).unlistedFindings; },
     "form leaves out findings"},
    {"MoreFindingsThanTheMaximum", FORM,
     [](auto &report) {
       auto &findings = ResultOf(report, Check::FORM).findings;
       findings.insert(findings.end(), TokenReport::MAX_FINDINGS, findings.front());
     },
     "there are 100"},
    {"AnEscapeIsMissing", ACCEPTED, [](auto &report) { ResultOf(report, Check::FORM).summary += "\xE2\x80\xAE"; },
     "form, summary is not printable"},
    {"AKeyHasAControlCharacter", ACCEPTED, [](auto &report) { report.trustedKeys.front().subject += "\xC2\x9B"; },
     "trusted key, subject is not printable"},
    {"ATextIsNotCut", ACCEPTED, [](auto &report) { report.references.front().uri += std::string(2000, 'x'); },
     "reference, URI has 20"},
    {"TheLineOfASyntaxErrorIsWrong", SYNTAX, [](auto &report) { ++FirstFinding(report, Check::WELL_FORMED).line; },
     "the syntax error has another line or column"},
    {"TheColumnOfASyntaxErrorIsMissing", SYNTAX,
     [](auto &report) { FirstFinding(report, Check::WELL_FORMED).column = 0; },
     "the syntax error has another line or column"},
    {"ClaimsOfATextThatCannotBeParsed", SYNTAX, [](auto &report) { report.claims.isAssertion = true; },
     "there are claims of a text"},
    {"ClaimsWithoutAssertion", SYNTAX, [](auto &report) { report.claims.audience.insert("x"); },
     "there are claims, but no assertion"},
    {"AGroupIsLeftOut", ACCEPTED, [](auto &report) { report.claims.groups.pop_back(); }, "the token says:"},
    {"AnotherSubject", ACCEPTED, [](auto &report) { report.claims.subject->name = "mallory"; }, "the token says:"},
    {"ADigestMatchesWrongly", CHANGED, [](auto &report) { report.references.front().digestMatches = true; },
     "a digest "},
    {"NoReferenceCoversTheToken", ACCEPTED, [](auto &report) { report.references.front().coversToken = false; },
     "accepted, but no reference covers"},
    {"NoKeyMadeTheSignature", ACCEPTED,
     [](auto &report) {
       for (auto &key : report.trustedKeys) {
         key.madeSignature = false;
       }
     },
     "SIGNATURE passed, but no key made it"},
    {"ATrustedKeyIsLeftOut", ACCEPTED, [](auto &report) { report.trustedKeys.pop_back(); },
     "some trusted keys are missing"},
    {"AnUnknownCertificateIsTrusted", ACCEPTED,
     [](auto &report) {
       report.namedCertificates.push_back({"CN=stranger", std::string(64, '0'), true});
     },
     "a named certificate is trusted wrongly"},
    {"TheMissedTimeIsWrong", EXPIRED, [](auto &report) { FirstFinding(report, Check::VALIDITY).missedBySec += 600; },
     "the clock misses the end by"},
    {"TheTimeIsWrong", ACCEPTED, [](auto &report) { report.checkedAt = Tarvel::System::DateTime(); },
     "the report has another time"},
};

class WrongReport : public testing::TestWithParam<WrongChange> {};

TEST_P(WrongReport, IsNoticed) {
  const WrongChange &wrong = GetParam();
  const Testing::FixedEnvironment clock;
  const Testing::Judgement judgement = Testing::JudgeText(UsualVerifier(), Testing::ReadDataFile(wrong.file));
  ASSERT_EQ("", judgement.contradictions);
  TokenReport report = judgement.report;
  wrong.change(report);
  const std::string noticed = '\n' + Testing::FindContradictions(report, judgement.verification, UsualVerifier());
  EXPECT_NE(std::string::npos, noticed.find('\n' + std::string(wrong.noticed))) << noticed;
}

INSTANTIATE_TEST_SUITE_P(Because, WrongReport, testing::ValuesIn(CHANGES),
                         [](const auto &change) { return std::string(change.param.name); });

TEST(WrongPlace, IsNoticed) {
  const Testing::FixedEnvironment clock;
  const std::string xml = Testing::ReadDataFile("attacks/namespace-conditions-rebound.xml");
  const TokenReport report = UsualVerifier().verifier.Explain(xml);
  Tarvel::Ref<Tarvel::Xml::Document> document;
  SsoClient::ParseXML(xml, document);
  ASSERT_EQ("", Testing::FindWrongPlaces(report, *document));
  const std::pair<std::function<void(TokenReport::Finding &)>, std::string> changes[] = {
      {[](auto &finding) { ++finding.line; }, "no element begins at the line and column"},
      {[](auto &finding) { --finding.column; }, "no element begins at the line and column"},
      {[](auto &finding) { finding.element = "saml:Subject"; },
       "another element begins at the line and column: saml:Conditions"},
      {[](auto &finding) { finding.path = "/saml:Conditions"; }, "the path should be /saml:Assertion/saml:Conditions"},
      {[](auto &finding) { finding.element.clear(); }, "a finding without element has a place"},
  };
  for (const auto &[change, noticed] : changes) {
    TokenReport wrong = report;
    change(FirstFinding(wrong, Check::FORM));
    EXPECT_NE(std::string::npos, Testing::FindWrongPlaces(wrong, *document).find(noticed)) << noticed;
  }
}

TEST(IsPrintable, RefusesEveryCharacterThatControlsATerminalAndNoOther) {
  for (const char *const text : {"\n",           "\r",           "\t",
                                 "\x1B[2J",      "\x7F",         "\xC2\x80",
                                 "\xC2\x9B",     "\xC2\x9F",     "\xD8\x9C",
                                 "\xE2\x80\x8E", "\xE2\x80\x8F", "\xE2\x80\xA8",
                                 "\xE2\x80\xA9", "\xE2\x80\xAA", "\xE2\x80\xAE",
                                 "\xE2\x81\xA6", "\xE2\x81\xA9", "\x9B",
                                 "a\x85",        "\xE2\x80",     "\xE2\x9B\x9B\x9B"}) {
    EXPECT_FALSE(Testing::IsPrintable(text)) << testing::PrintToString(std::string(text));
  }
  for (const char *const text :
       {"", "a", "~ ", "\xC2\xA0", "\xC3\xA9", "\xD8\x9B", "\xD8\x9D", "\xE2\x80\x8D", "\xE2\x80\x90", "\xE2\x80\xA7",
        "\xE2\x80\xAF", "\xE2\x81\xA5", "\xE2\x81\xAA", "\xF0\x9F\x98\x80", "\xE2\x9B\x9B", "\xFF", "\xC3"}) {
    EXPECT_TRUE(Testing::IsPrintable(text)) << testing::PrintToString(std::string(text));
  }
}

} // namespace
} // namespace Reports
