// SPDX-License-Identifier: Apache-2.0

#include "token/report_recorder.h"

#include "support/parsed_document.h"

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

Deviation Saying(const std::string &message) {
  return {message, nullptr, {}, {}, {}, 0};
}

/// Adds `count` deviations like a rule, which makes no text for a full sink.
void Fill(ReportRecorder &recorder, std::size_t count) {
  for (std::size_t index = 0; index < count; ++index) {
    ReportDeviation(recorder, [] { return Saying("again"); });
  }
}

TEST(ReportRecorder, BeginsTheReportWithAllChecksNotDone) {
  TokenReport report;
  const ReportRecorder recorder(report);
  ASSERT_EQ(14u, report.checks.size());
  for (std::size_t index = 0; index < report.checks.size(); ++index) {
    EXPECT_EQ(static_cast<Check>(index), report.checks[index].check);
    EXPECT_EQ(Outcome::NOT_DONE, report.checks[index].outcome);
  }
}

TEST(ReportRecorder, RecordsADeviationWithItsPlace) {
  const Testing::ParsedDocument document("<a>\n<b/></a>");
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::FORM);
  recorder.Add({"message", &document.Child("b"), "attribute", "allowed", "found", 7});
  ASSERT_EQ(1u, report.Get(Check::FORM).findings.size());
  const TokenReport::Finding &finding = report.Get(Check::FORM).findings.front();
  EXPECT_EQ("message", finding.message);
  EXPECT_EQ("b", finding.element);
  EXPECT_EQ("attribute", finding.attribute);
  EXPECT_EQ("/a/b", finding.path);
  EXPECT_EQ(2u, finding.line);
  EXPECT_EQ(1u, finding.column);
  EXPECT_EQ("allowed", finding.wanted);
  EXPECT_EQ("found", finding.found);
  EXPECT_EQ(7, finding.missedBySec);
  EXPECT_EQ(Outcome::FAILED, report.Get(Check::FORM).outcome);
}

TEST(ReportRecorder, MakesAllTextsExceptTheRefusalPrintable) {
  const std::string hostile = "a\x1b[31m\n\u202e\u0085z";
  const std::string shown = "a\\u001B[31m\\u000A\\u202E\\u0085z";
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::FORM);
  recorder.Add({hostile, nullptr, hostile, hostile, hostile, 0});
  recorder.Summarize(hostile);
  recorder.ReplaceFirstRemedy(hostile);
  const TokenReport::CheckResult &form = report.Get(Check::FORM);
  EXPECT_EQ(hostile, report.refusal);
  EXPECT_EQ(shown, form.findings.front().message);
  EXPECT_EQ(shown, form.findings.front().attribute);
  EXPECT_EQ(shown, form.findings.front().wanted);
  EXPECT_EQ(shown, form.findings.front().found);
  EXPECT_EQ(shown, form.findings.front().remedy);
  EXPECT_EQ(shown, form.summary);
}

TEST(ReportRecorder, MakesNamesOfElementsPrintable) {
  const Testing::ParsedDocument document("<a\u061c><b\u061c/></a\u061c>");
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::FORM);
  recorder.Add({"message", &document.Child("b\u061c"), {}, {}, {}, 0});
  EXPECT_EQ("b\\u061C", report.Get(Check::FORM).findings.front().element);
  EXPECT_EQ("/a\\u061C/b\\u061C", report.Get(Check::FORM).findings.front().path);
}

TEST(ReportRecorder, DoesNotCutAValueAgainThatARuleHasCut) {
  const std::string cut = Tarvel::StringUtil::Shorten(std::string(5000, 'x'));
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::FORM);
  recorder.Add({"message", nullptr, {}, cut, cut, 0});
  EXPECT_EQ(cut, report.Get(Check::FORM).findings.front().wanted);
  EXPECT_EQ(cut, report.Get(Check::FORM).findings.front().found);
}

TEST(ReportRecorder, CutsAllTextsExceptTheRefusal) {
  const std::string text(2000, 'x');
  const std::string cut = std::string(1024, 'x') + "... (976 more bytes)";
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::FORM);
  recorder.Add({text, nullptr, text, text, text, 0});
  recorder.Summarize(text);
  const TokenReport::Finding &finding = report.Get(Check::FORM).findings.front();
  EXPECT_EQ(text, report.refusal);
  EXPECT_EQ(cut, finding.message);
  EXPECT_EQ(cut, finding.attribute);
  EXPECT_EQ(cut, finding.wanted);
  EXPECT_EQ(cut, finding.found);
  EXPECT_EQ(cut, report.Get(Check::FORM).summary);
}

TEST(ReportRecorder, ListsAtMostAThousandFindingsAndAtLeastOneOfEachCheck) {
  TokenReport report;
  ReportRecorder recorder(report);
  std::size_t listed = 0;
  for (const TokenReport::CheckResult &result : report.checks) {
    recorder.Begin(result.check);
    Fill(recorder, 2000);
    EXPECT_EQ(2000u, recorder.CountFindings());
    EXPECT_EQ(2000u, result.findings.size() + result.unlistedFindings);
    EXPECT_EQ(Outcome::FAILED, result.outcome);
    listed += result.findings.size();
    EXPECT_EQ(result.check == Check::WELL_FORMED ? 987u : 1u, result.findings.size());
  }
  EXPECT_EQ(TokenReport::MAX_FINDINGS, listed);
}

TEST(ReportRecorder, ListsAllFindingsUpToTheLimit) {
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::REQUIRED_CONFIRMATION);
  Fill(recorder, TokenReport::MAX_FINDINGS);
  EXPECT_EQ(1000u, report.Get(Check::REQUIRED_CONFIRMATION).findings.size());
  EXPECT_EQ(0u, report.Get(Check::REQUIRED_CONFIRMATION).unlistedFindings);
  EXPECT_TRUE(recorder.IsFull());
}

TEST(ReportRecorder, ListsFewerFindingsIfTheirMessagesAreVeryLongButOneOfEachCheck) {
  const std::string text(16u * 1024 * 1024, 'x');
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::FORM);
  for (int index = 0; index < 10; ++index) {
    ReportDeviation(recorder, [&text] { return Saying(text); });
  }
  recorder.Begin(Check::NAMES);
  Fill(recorder, 2);
  EXPECT_EQ(3u, report.Get(Check::FORM).findings.size());
  EXPECT_EQ(7u, report.Get(Check::FORM).unlistedFindings);
  EXPECT_EQ(1u, report.Get(Check::NAMES).findings.size());
  EXPECT_EQ(1u, report.Get(Check::NAMES).unlistedFindings);
}

TEST(ReportRecorder, ACheckThatWasNotDoneDoesNotPassButMayFail) {
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::NAMES);
  recorder.SetNotDone("missing");
  EXPECT_EQ(Outcome::NOT_DONE, report.Get(Check::NAMES).outcome);
  recorder.Begin(Check::AUDIENCE);
  Fill(recorder, 1);
  recorder.SetNotDone("missing");
  EXPECT_EQ(Outcome::FAILED, report.Get(Check::AUDIENCE).outcome);
  EXPECT_EQ("missing", report.Get(Check::AUDIENCE).summary);
}

TEST(ReportRecorder, SkipsACheckAndAllAfterIt) {
  TokenReport report;
  ReportRecorder recorder(report);
  recorder.Begin(Check::NAMES);
  recorder.SkipFrom(Check::AUDIENCE, "missing");
  EXPECT_EQ(Outcome::PASSED, report.Get(Check::NAMES).outcome);
  EXPECT_EQ(Outcome::NOT_DONE, report.Get(Check::AUDIENCE).outcome);
  EXPECT_EQ(Outcome::NOT_DONE, report.Get(Check::REQUIRED_CONFIRMATION).outcome);
  EXPECT_EQ("missing", report.Get(Check::REQUIRED_CONFIRMATION).summary);
}

} // namespace
