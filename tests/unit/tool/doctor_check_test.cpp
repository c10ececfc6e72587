// SPDX-License-Identifier: Apache-2.0

#include "doctor_texts.h"

#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

DoctorCheck FailedCheck() {
  DoctorCheck check("tls");
  check.found = {"One reason.", "Another."};
  check.details = {"Certificate 1."};
  check.Fail(ExitCode::COMMUNICATION, "Do this.");
  check.Fail(ExitCode::SERVICE_FAULT, "Do that.");
  check.facts = {{"version", nullptr}};
  return check;
}

DoctorCheck FineCheck() {
  DoctorCheck check("certificates");
  check.found = {"2 certificates."};
  return check;
}

TEST(RenderChecks, ShowsNameOutcomeFindingsDetailsAndAdviceInColumns) {
  EXPECT_EQ("tls           failed    One reason.\n"
            "                        Another.\n"
            "                        Certificate 1.\n"
            "              to do     Do this.\n"
            "                        Do that.\n"
            "certificates  fine      2 certificates.\n",
            RenderChecks({FailedCheck(), FineCheck()}, {100, false}));
}

TEST(RenderChecks, WrapsTextsAtTheWidth) {
  DoctorCheck check("tcp");
  check.found = {"A sentence of some words, which are too many for one line."};
  check.Warn("Some advice that is also too long for a line.");
  EXPECT_EQ("tcp           warning   A sentence of some words, which are\n"
            "                        too many for one line.\n"
            "              to do     Some advice that is also too long\n"
            "                        for a line.\n",
            RenderChecks({check}, {60, false}));
}

TEST(RenderChecks, ColoursNameOutcomeAndTheWordForAdvice) {
  DoctorCheck warning("tcp");
  warning.found = {"Slow."};
  warning.Warn("Hurry.");
  DoctorCheck skipped("http");
  skipped.Skip("Nothing.");
  EXPECT_EQ("\x1b[1mtls\x1b[0m           \x1b[31mfailed\x1b[0m    One reason.\n"
            "                        Another.\n"
            "                        Certificate 1.\n"
            "              \x1b[1mto do\x1b[0m     Do this.\n"
            "                        Do that.\n"
            "\x1b[1mtcp\x1b[0m           \x1b[33mwarning\x1b[0m   Slow.\n"
            "              \x1b[1mto do\x1b[0m     Hurry.\n"
            "\x1b[1mcertificates\x1b[0m  \x1b[32mfine\x1b[0m      2 certificates.\n"
            "\x1b[1mhttp\x1b[0m          not done  Nothing.\n",
            RenderChecks({FailedCheck(), warning, FineCheck(), skipped}, {100, true}));
}

TEST(RenderChecksJson, HasFindingsAndAdviceAsTextsAndTheFactsAsFurtherKeys) {
  EXPECT_EQ("{\n"
            "  \"schema\": 1,\n"
            "  \"checks\": [\n"
            "    {\n"
            "      \"name\": \"tls\",\n"
            "      \"outcome\": \"failed\",\n"
            "      \"found\": \"One reason. Another.\",\n"
            "      \"todo\": \"Do this. Do that.\",\n"
            "      \"version\": null\n"
            "    },\n"
            "    {\n"
            "      \"name\": \"certificates\",\n"
            "      \"outcome\": \"fine\",\n"
            "      \"found\": \"2 certificates.\",\n"
            "      \"todo\": null\n"
            "    }\n"
            "  ]\n"
            "}\n",
            RenderChecksJson({FailedCheck(), FineCheck()}));
}

TEST(RenderChecksJson, IsValidForAllOctetsThatAServerSends) {
  DoctorCheck check("http");
  check.found = {"\xff\x80"};
  EXPECT_EQ("\xEF\xBF\xBD\xEF\xBF\xBD", JsonOf(check).at("found").get<std::string>());
}

TEST(ExitCodeOf, IsThatOfTheFirstFailureOfTheFirstCheckThatFailed) {
  DoctorCheck later("http");
  later.Fail(ExitCode::SERVICE_FAULT, "x");
  EXPECT_EQ(ExitCode::COMMUNICATION, ExitCodeOf({FineCheck(), FailedCheck(), later}));
  EXPECT_EQ(ExitCode::SERVICE_FAULT, ExitCodeOf({FineCheck(), later}));
}

TEST(ExitCodeOf, IsDoneForWarningsAndChecksThatWereNotDone) {
  DoctorCheck warning("tcp");
  warning.Warn("x");
  DoctorCheck skipped("http");
  skipped.Skip("y");
  EXPECT_EQ(ExitCode::DONE, ExitCodeOf({warning, skipped, FineCheck()}));
}

TEST(DoctorCheck, StaysFailedAfterAWarning) {
  DoctorCheck check = FailedCheck();
  check.Warn("x");
  EXPECT_EQ(CheckOutcome::FAILED, check.outcome);
  DoctorCheck warned("x");
  warned.Warn("x");
  warned.Fail(ExitCode::FILE_OR_KEY, "y");
  EXPECT_EQ(CheckOutcome::FAILED, warned.outcome);
}

TEST(Shown, EscapesWhatControlsATerminalAndIsCut) {
  EXPECT_EQ("a\\u001B[31mb\\u202Ec", Shown("a\x1b[31mb\xE2\x80\xAE"
                                           "c"));
  EXPECT_EQ(std::string(200, 'a') + "... (800 more bytes)", Shown(std::string(1000, 'a')));
}

TEST(Sentence, BeginsWithACapitalLetterAndEndsWithAFullStop) {
  EXPECT_EQ("The server.", Sentence("the server"));
  EXPECT_EQ("1 server.", Sentence("1 server"));
  EXPECT_EQ(".", Sentence(""));
}

} // namespace
} // namespace SsoClient::Tool
