// SPDX-License-Identifier: Apache-2.0
// The JSON and the text of a token and of its report.

#include "token_view.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <algorithm>
#include <string>
#include <vector>

namespace SsoClient::Tool {
namespace {

using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;
using nlohmann::ordered_json;
using Tarvel::System::DateTime;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

/// A report of all checks, each passed.
TokenReport Passed() {
  TokenReport report;
  report.accepted = true;
  for (int check = 0; check <= static_cast<int>(Check::REQUIRED_CONFIRMATION); ++check) {
    report.checks.push_back({static_cast<Check>(check), Outcome::PASSED, "As it should be.", {}, 0});
  }
  report.checkedAt = DateTime("2026-01-01T12:00:00Z");
  report.claims.isAssertion = true;
  return report;
}

TokenReport::CheckResult &ResultOf(TokenReport &report, Check check) {
  return report.checks.at(static_cast<std::size_t>(check));
}

void Fail(TokenReport &report, Check check, const std::string &message) {
  TokenReport::CheckResult &result = ResultOf(report, check);
  result.outcome = Outcome::FAILED;
  result.summary = "Something is wrong.";
  TokenReport::Finding finding;
  finding.message = message;
  result.findings.push_back(finding);
  report.accepted = false;
  if (report.refusal.empty()) {
    report.refusal = message;
  }
}

/// A report such as that on a token from another maker's service.
TokenReport Foreign() {
  TokenReport report = Passed();
  Fail(report, Check::FORM, "Unexpected attribute: 'Id'");
  TokenReport::Finding &finding = ResultOf(report, Check::FORM).findings.front();
  finding.element = "Assertion";
  finding.attribute = "Id";
  finding.path = "/Assertion";
  finding.line = 1;
  finding.column = 7;
  finding.wanted = "no such attribute";
  finding.found = "Id=\"x\"";
  finding.remedy = "Ask for the accepted form.";
  Fail(report, Check::KEYS, "No key");
  ResultOf(report, Check::SIGNATURE).outcome = Outcome::NOT_DONE;
  ResultOf(report, Check::REQUIRED_CONFIRMATION).outcome = Outcome::NOT_DONE;
  return report;
}

TokenView ViewWith(TokenFacts facts, TokenReport report) {
  TokenView view;
  view.facts = std::move(facts);
  view.report = WithoutTrust(std::move(report));
  view.now = DateTime("2026-01-01T12:00:00Z");
  return view;
}

std::vector<std::string> KeysOf(const ordered_json &json) {
  std::vector<std::string> keys;
  for (const auto &item : json.items()) {
    keys.push_back(item.key());
  }
  return keys;
}

TEST(TokenJson, HasNullForWhatIsNotKnown) {
  TokenFacts facts;
  facts.id = "_1";
  const ordered_json json = ordered_json::parse(TokenJson(ViewWith(facts, Foreign())));
  EXPECT_THAT(KeysOf(json), ElementsAre("schema", "verified", "id", "subject", "confirmation", "notBefore",
                                        "notOnOrAfter", "renewable", "delegable", "solution", "fullName", "groups",
                                        "delegation", "audience", "advice", "certificate", "nameId", "issuer",
                                        "issueInstant", "confirmations", "audienceRestrictions", "oneTimeUse",
                                        "proxyRestriction", "authnStatements", "attributes", "report"));
  EXPECT_EQ(1, json["schema"]);
  EXPECT_EQ(false, json["verified"]);
  EXPECT_EQ("_1", json["id"]);
  for (const char *key : {"subject", "confirmation", "notBefore", "notOnOrAfter", "renewable", "delegable", "solution",
                          "fullName", "certificate", "nameId", "issuer", "issueInstant", "confirmations",
                          "audienceRestrictions", "oneTimeUse", "proxyRestriction", "authnStatements", "attributes"}) {
    EXPECT_TRUE(json[key].is_null()) << key;
  }
  for (const char *key : {"groups", "delegation", "audience", "advice"}) {
    EXPECT_EQ(ordered_json::array(), json[key]) << key;
  }
}

TEST(TokenJson, OfARefusedTokenHasNothingThatTheTokenStates) {
  TokenView view;
  view.report = ReportView{Foreign()};
  const ordered_json json = ordered_json::parse(TokenJson(view));
  for (const auto &item : json.items()) {
    const bool isAboutTheCheck = item.key() == "schema" || item.key() == "verified" || item.key() == "report";
    EXPECT_NE(isAboutTheCheck, item.value().is_null()) << item.key();
  }
  EXPECT_EQ(26u, json.size());
}

TEST(ReportJson, HasEachPartOfTheReport) {
  TokenReport report = Foreign();
  ResultOf(report, Check::FORM).unlistedFindings = 3;
  report.signatureAlgorithm = "urn:algorithm";
  report.canonicalization = "urn:c14n";
  TokenReport::Reference reference;
  reference.uri = "#_1";
  reference.transforms = {"urn:t"};
  reference.digestMethod = "urn:d";
  reference.digestWanted = "AA==";
  report.references.push_back(reference);
  TokenReport::TrustedKey key;
  key.subject = "CN=sts";
  key.thumbprint = "ab";
  key.isUsable = true;
  report.trustedKeys.push_back(key);
  report.namedCertificates.push_back({"CN=stranger", "cd", false});
  report.claims.issuer = "sts";
  report.claims.nameId = "alice";
  report.claims.nameIdFormat = "urn:f";
  report.claims.confirmationMethod = "urn:m";
  report.claims.issueInstant = DateTime("2026-01-01T13:00:00+01:00");
  const ordered_json json = ReportJson({report});
  EXPECT_THAT(KeysOf(json), ElementsAre("accepted", "refusal", "checkedAt", "checks", "algorithm", "canonicalization",
                                        "references", "keys", "namedCertificates", "claims"));
  EXPECT_EQ(false, json["accepted"]);
  EXPECT_EQ("Unexpected attribute: 'Id'", json["refusal"]);
  EXPECT_EQ("2026-01-01T12:00:00.000Z", json["checkedAt"]);
  EXPECT_EQ(14u, json["checks"].size());
  EXPECT_EQ(
      R"({"name":"well-formed","outcome":"passed","summary":"As it should be.","findings":[],"unlistedFindings":0})",
      json["checks"][0].dump());
  EXPECT_EQ(R"({"name":"form","outcome":"failed","summary":"Something is wrong.","findings":[)"
            R"({"message":"Unexpected attribute: 'Id'","element":"Assertion","attribute":"Id","path":"/Assertion",)"
            R"("line":1,"column":7,"wanted":"no such attribute","found":"Id=\"x\"","missedBySec":null,)"
            R"("remedy":"Ask for the accepted form."}],"unlistedFindings":3})",
            json["checks"][1].dump());
  EXPECT_EQ("urn:algorithm", json["algorithm"]);
  EXPECT_EQ("urn:c14n", json["canonicalization"]);
  EXPECT_EQ(R"([{"uri":"#_1","resolves":false,"coversToken":false,"target":null,"transforms":["urn:t"],)"
            R"("digestMethod":"urn:d","digestWanted":"AA==","digestComputed":null,"digestMatches":false}])",
            json["references"].dump());
  EXPECT_EQ(R"([{"subject":"CN=sts","sha256":"ab","named":false,"usable":true,"madeSignature":false}])",
            json["keys"].dump());
  EXPECT_EQ(R"([{"subject":"CN=stranger","sha256":"cd","trusted":false}])", json["namedCertificates"].dump());
  EXPECT_EQ(R"({"issuer":"sts","issueInstant":"2026-01-01T12:00:00.000Z","nameId":"alice","nameIdFormat":"urn:f",)"
            R"("confirmationMethod":"urn:m"})",
            json["claims"].dump());
}

TEST(ReportJson, WithoutTrustAcceptsAndRefusesNothing) {
  TokenReport report = Passed();
  Fail(report, Check::KEYS, "No key");
  ResultOf(report, Check::SIGNATURE).outcome = Outcome::NOT_DONE;
  report.namedCertificates.push_back({"CN=sts", "cd", false});
  const ordered_json json = ReportJson(WithoutTrust(report));
  EXPECT_TRUE(json["accepted"].is_null());
  EXPECT_TRUE(json["refusal"].is_null());
  EXPECT_TRUE(json["namedCertificates"][0]["trusted"].is_null());
  for (const Check check : {Check::KEYS, Check::SIGNATURE}) {
    EXPECT_EQ(std::string(R"({"name":")") + GetCheckName(check) +
                  R"(","outcome":"not done","summary":"Not checked, because no trusted certificate was given.",)"
                  R"("findings":[],"unlistedFindings":0})",
              json["checks"][static_cast<std::size_t>(check)].dump());
  }
}

TEST(ReportJson, WithoutTrustHasTheRefusalThatNeedsNoTrust) {
  TokenReport report = Passed();
  Fail(report, Check::KEYS, "No key");
  Fail(report, Check::NAMES, "No name");
  EXPECT_EQ("No name", ReportJson(WithoutTrust(report))["refusal"]);
  Fail(report, Check::FORM, "No form");
  report.refusal = "No form, exactly";
  EXPECT_EQ("No form, exactly", ReportJson(WithoutTrust(report))["refusal"]);
}

TEST(TokenJson, IsAsciiEvenIfTheTokenIsNot) {
  TokenFacts facts;
  facts.id = "\xC3\xA9\xE2\x80\xAE\x1B";
  TokenReport report = Foreign();
  report.claims.issuer = "\xC2\x9B\x7F"
                         "2J";
  ResultOf(report, Check::FORM).findings.front().found = "cut \xE2\x80"; // within a character
  const std::string json = TokenJson(ViewWith(facts, report));
  EXPECT_TRUE(std::all_of(json.begin(), json.end(), [](char octet) {
    return octet == '\n' || (octet >= ' ' && octet <= '~');
  })) << json;
  EXPECT_EQ(*facts.id, ordered_json::parse(json)["id"].get<std::string>());
}

const TextStyle PLAIN{100, false};

TEST(TokenText, ShowsUnknownForWhatIsNotKnown) {
  EXPECT_THAT(TokenText(ViewWith({}, Foreign()), PLAIN),
              testing::StartsWith(R"(Verified:        no, nothing below was checked
Id:              unknown
Subject:         unknown
Confirmation:    unknown
Not before:      unknown
Not on or after: unknown
Renewable:       unknown
Delegable:       unknown
Solution:        unknown

)"));
}

TEST(TokenText, ShowsHowFarTimesAreAway) {
  TokenFacts facts;
  facts.startDate = DateTime("2026-01-01T11:59:00Z");
  facts.endDate = DateTime("2026-01-01T19:12:00Z");
  const std::string text = TokenText(ViewWith(facts, Foreign()), PLAIN);
  EXPECT_THAT(text, HasSubstr("\nNot before:      2026-01-01T11:59:00.000Z (1 min ago)\n"));
  EXPECT_THAT(text, HasSubstr("\nNot on or after: 2026-01-01T19:12:00.000Z (in 7 h 12 min)\n"));
}

TEST(TokenText, WithoutTrustListsWhatDeviatesAndWhatWasNotChecked) {
  TokenReport report = Foreign();
  report.claims.nameId = "alice";
  EXPECT_THAT(TokenText(ViewWith({}, report), PLAIN), EndsWith(R"(
Name:            alice

Check  Outcome  What was found                                What to do
form   failed   Something is wrong.
                Unexpected attribute: 'Id'                    Ask for the accepted form.
                  line 1, column 7: /Assertion, attribute Id
                  wanted: no such attribute
                  found: Id="x"

The signature and the keys were not checked, because no trusted certificate was given.
)"));
}

TEST(TokenText, WithoutTrustHasNoTableIfNothingDeviates) {
  const std::string text = TokenText(ViewWith({}, Passed()), PLAIN);
  EXPECT_THAT(text, Not(HasSubstr("Outcome")));
  EXPECT_THAT(text, EndsWith("\n\nThe signature and the keys were not checked, because no trusted certificate was "
                             "given.\n"));
}

TEST(TokenText, OfARefusedTokenHasNothingThatTheTokenStates) {
  TokenView view;
  view.report = ReportView{Foreign()};
  const std::string text = TokenText(view, PLAIN);
  EXPECT_THAT(text, testing::StartsWith("Verified:        no\n\nCheck "));
  EXPECT_THAT(text, Not(HasSubstr("Subject:")));
}

TEST(ReportText, ListsEachCheckWithItsOutcome) {
  const std::string text = ReportText({Foreign()}, PLAIN);
  EXPECT_THAT(text, HasSubstr("\nwell-formed            passed    As it should be.\n"));
  EXPECT_THAT(text, HasSubstr("\nkeys                   failed    Something is wrong.\n"));
  EXPECT_THAT(text, HasSubstr("\nsignature              not done  As it should be.\n"));
  EXPECT_EQ(1 + 14 + 5 + 1, std::count(text.begin(), text.end(), '\n')); // headings, checks, two findings
}

TEST(ReportText, ShowsByHowMuchAClockMissesAndHowManyFindingsAreLeftOut) {
  TokenReport report = Passed();
  Fail(report, Check::VALIDITY, "The token has expired");
  ResultOf(report, Check::VALIDITY).findings.front().missedBySec = 3660;
  ResultOf(report, Check::VALIDITY).unlistedFindings = 2;
  EXPECT_THAT(ReportText({report}, PLAIN), HasSubstr("  The token has expired\n"
                                                     "                                  missed by 1 h 1 min\n"
                                                     "                                and 2 more findings\n"));
}

TEST(ReportText, ShowsOnceWhatToDoAboutSeveralFindings) {
  TokenReport report = Passed();
  for (const char *message : {"One", "Two", "Three"}) {
    Fail(report, Check::FORM, message);
    ResultOf(report, Check::FORM).findings.back().remedy = std::string(message) == "Three" ? "Wait." : "Ask.";
  }
  EXPECT_THAT(ReportText({report}, PLAIN), HasSubstr("  One                  Ask.\n"
                                                     "                                Two\n"
                                                     "                                Three                Wait.\n"));
}

TEST(ReportText, HasColoursOnlyForOutcomesAndOnlyIfAsked) {
  TokenReport report = Foreign();
  const std::string coloured = ReportText({report}, {100, true});
  EXPECT_THAT(coloured, HasSubstr("  \033[32mpassed\033[0m"));
  EXPECT_THAT(coloured, HasSubstr("  \033[31mfailed\033[0m"));
  EXPECT_THAT(coloured, HasSubstr("  \033[33mnot done\033[0m"));
  EXPECT_EQ(2 * 14, std::count(coloured.begin(), coloured.end(), '\033'));
  EXPECT_THAT(ReportText({report}, PLAIN), Not(HasSubstr("\033")));
}

TEST(ReportText, ShowsThatAKeyWasNotTriedIfTheSignaturesAlgorithmIsNotKnown) {
  TokenReport report = Passed();
  report.signatureAlgorithm.clear();
  report.trustedKeys.resize(1);
  report.trustedKeys[0].subject = "CN=sts";
  report.trustedKeys[0].thumbprint = "ab";
  EXPECT_THAT(ReportText({report}, PLAIN),
              HasSubstr("Trusted key:     CN=sts\n"
                        "                 SHA-256 ab\n"
                        "                 was not tried, because the signature's algorithm is not known\n"));
}

TEST(ReportText, ShowsReferencesKeysAndNamedCertificates) {
  TokenReport report = Passed();
  report.signatureAlgorithm = "urn:algorithm";
  report.canonicalization = "urn:c14n";
  TokenReport::Reference reference;
  reference.uri = "#_1";
  reference.resolves = true;
  reference.coversToken = true;
  reference.target = "Assertion";
  reference.transforms = {"urn:t"};
  reference.digestMethod = "urn:d";
  reference.digestWanted = "AA==";
  reference.digestComputed = "AQ==";
  report.references.push_back(reference);
  report.trustedKeys.resize(3);
  for (TokenReport::TrustedKey &key : report.trustedKeys) {
    key.subject = "CN=sts";
    key.thumbprint = "ab";
  }
  report.trustedKeys[1].isUsable = true;
  report.trustedKeys[2].madeSignature = true;
  report.namedCertificates = {{"CN=stranger", "cd", false}, {"", "", true}};
  EXPECT_THAT(ReportText({report}, PLAIN), testing::StartsWith(R"(Signature:       urn:algorithm
                 urn:c14n
Reference:       #_1
                 Assertion, covers the token
                 digest AQ==, signed: AA==
                 urn:d
                 urn:t
Trusted key:     CN=sts
                 SHA-256 ab
                 cannot be used with the signature's algorithm
Trusted key:     CN=sts
                 SHA-256 ab
                 did not make the signature
Trusted key:     CN=sts
                 SHA-256 ab
                 made the signature
In the token:    CN=stranger
                 SHA-256 cd
                 is not trusted, and was not used
In the token:    a certificate that cannot be read
                 is trusted

Check )"));
}

TEST(ReportText, LetsNothingControlTheTerminal) {
  TokenReport report = Foreign();
  report.claims.issuer = "\x1B[2J";
  report.claims.nameId = "a\nVerified: yes";
  report.claims.nameIdFormat = "\xE2\x80\xAE";
  ResultOf(report, Check::FORM).findings.front().found = "\x1B]0;\nx";
  const std::string text = ReportText({report}, PLAIN);
  EXPECT_THAT(text, Not(HasSubstr("\x1B")));
  EXPECT_THAT(text, Not(HasSubstr("\xE2\x80\xAE")));
  EXPECT_THAT(text, HasSubstr("Name:            a\\u000AVerified: yes\n"));
  EXPECT_THAT(text, HasSubstr("found: \\u001B]0;\\u000Ax"));
}

} // namespace
} // namespace SsoClient::Tool
