// SPDX-License-Identifier: Apache-2.0
// `inspect` shows what the first assertion in a well-formed document says, and what deviates from the accepted form.

#include "expect_result.h"
#include "expected_output.h"
#include "process.h"
#include "token_values.h"

#include "support/data_file.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

namespace ToolTest {
namespace {

using nlohmann::ordered_json;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using Testing::ReadDataFile;
using testing::StartsWith;

constexpr const char *NOT_CHECKED =
    "\nThe signature and the keys were not checked, because no trusted certificate was given.\n";

/// The JSON that `inspect` shows of `file`.
ordered_json InspectJson(const std::string &file) {
  const Result result = RunTool({"inspect", "--format", "json", file});
  EXPECT_EQ(0, result.exitCode) << file;
  EXPECT_EQ("", result.err) << file;
  return ordered_json::parse(result.out);
}

ordered_json CheckIn(const ordered_json &report, const std::string &name) {
  for (const auto &check : report["checks"]) {
    if (check["name"] == name) {
      return check;
    }
  }
  ADD_FAILURE() << "no check " << name;
  return {};
}

std::string OutcomeIn(const ordered_json &report, const std::string &name) {
  return CheckIn(report, name)["outcome"].get<std::string>();
}

bool IsAscii(const std::string &text) {
  return std::all_of(text.begin(), text.end(),
                     [](char octet) { return octet == '\n' || (octet >= ' ' && octet <= '~'); });
}

TEST(Inspect, ShowsATokenAsTextAndSaysThatNothingWasChecked) {
  const Result result = RunTool({"inspect", "full.xml"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(WithoutDistances(result.out),
              StartsWith("Verified:        no, nothing below was checked\n" + Expected("full.txt") + "\nIssuer: "));
  EXPECT_THAT(result.out, Not(HasSubstr("Outcome"))); // nothing deviates
  EXPECT_THAT(result.out, EndsWith(NOT_CHECKED));
}

TEST(Inspect, NeverClaimsToVerify) {
  for (const auto &[token, expected] :
       {std::pair<std::string, std::string>("full.xml", "full.json"), {"bearer-minimal.xml", "minimal.json"}}) {
    const Result result = RunTool({"inspect", "--format", "json", token});
    ExpectResult({result.exitCode, WithoutReport(result.out), result.err}, 0, ExpectedJson(expected, false), "");
    const ordered_json report = ordered_json::parse(result.out)["report"];
    EXPECT_TRUE(report["accepted"].is_null());
    EXPECT_TRUE(report["refusal"].is_null());
    EXPECT_EQ(ordered_json::array(), report["keys"]);
    for (const auto &check : report["checks"]) {
      const bool needsTrust = check["name"] == "keys" || check["name"] == "signature";
      EXPECT_EQ(needsTrust ? "not done" : "passed", check["outcome"].get<std::string>()) << check["name"];
    }
  }
}

TEST(Inspect, ShowsTokensThatWouldBeRefusedForDatesOrSignature) {
  for (const char *file : {"expired.xml", "early.xml", "signed-by-other.xml", "../attacks/value-zeros.xml"}) {
    const Result result = RunTool({"inspect", "--format", "json", file});
    EXPECT_EQ(0, result.exitCode) << file;
    EXPECT_NE(std::string::npos, result.out.find("\"verified\": false,")) << file;
  }
}

TEST(Inspect, ShowsByHowMuchTheClockMissesTheEnd) {
  const ordered_json report = InspectJson("expired.xml")["report"];
  EXPECT_EQ("The token has expired at: 2021-01-01T00:00:00.000Z", report["refusal"]);
  const ordered_json finding = CheckIn(report, "validity")["findings"].at(0);
  EXPECT_GT(finding["missedBySec"].get<long long>(), 0);
  EXPECT_THAT(RunTool({"inspect", "expired.xml"}).out, HasSubstr("missed by "));
}

TEST(Inspect, FindsThatATokenWasChangedAfterItWasSigned) {
  std::string token = ReadDataFile("tokens/bearer.xml");
  const std::string alice = ">alice@";
  token.replace(token.find(alice), alice.size(), ">mallory@");
  const Result result = RunTool({"inspect", "--format", "json", "-"}, token);
  EXPECT_EQ(0, result.exitCode);
  const ordered_json report = ordered_json::parse(result.out)["report"];
  EXPECT_EQ("failed", OutcomeIn(report, "digests"));
  EXPECT_EQ(false, report["references"].at(0)["digestMatches"]);
  EXPECT_NE(report["references"].at(0)["digestWanted"], report["references"].at(0)["digestComputed"]);
}

TEST(Inspect, RefusesADocumentWithoutAnAssertion) {
  for (const char *file : {"../attacks/other-root.xml", "../attacks/soap-fault.xml", "../attacks/html.xml"}) {
    ExpectResult(RunTool({"inspect", file}), 5, "",
                 "ssoclient: token invalid: Expected element 'Assertion' not found.\n");
  }
  ExpectResult(RunTool({"inspect", "--format", "json", "../attacks/other-root.xml"}), 5, "",
               R"({"schema":1,"error":{"class":"ParseException","message":"Expected element 'Assertion' not found."}})"
               "\n");
}

TEST(Inspect, RefusesATextThatIsNotXml) {
  ExpectResult(RunTool({"inspect", "sts-rsa.crt"}), 5, "",
               "ssoclient: token invalid: text comes before the document element at line 1, column 1\n");
  ExpectResult(RunTool({"inspect", "--format", "json", "../attacks/empty.xml"}), 5, "",
               R"({"schema":1,"error":{"class":"XMLParseException","message":)"
               R"("the document is empty at line 1, column 1"}})"
               "\n");
}

TEST(Inspect, ShowsATokenOfAnotherFormAndWhatDeviates) {
  const Result result = RunTool({"inspect", "../attacks/split-comment.xml"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_THAT(result.out, StartsWith("Verified:        no, nothing below was checked\nId: "));
  EXPECT_THAT(result.out, HasSubstr("\nCheck "));
  EXPECT_THAT(result.out, HasSubstr("\nform "));
  EXPECT_THAT(InspectJson("../attacks/split-comment.xml")["report"]["refusal"].get<std::string>(),
              StartsWith("Element 'saml:NameID' must only have textual content"));
}

/// Expects the facts of an assertion of another maker's service, by itself or in a message.
void ExpectForeignToken(const ordered_json &json) {
  EXPECT_EQ(false, json["verified"]);
  EXPECT_EQ("_0f2b6d4e-7a31-4c58-9e0d-5b1c2a3f4e6d", json["id"]);
  EXPECT_TRUE(json["subject"].is_null());
  EXPECT_TRUE(json["confirmation"].is_null());
  EXPECT_EQ("2020-01-01T00:00:00.000Z", json["notBefore"]);
  EXPECT_EQ("2120-01-01T00:00:00.000Z", json["notOnOrAfter"]);
  EXPECT_EQ(R"(["https://files.corp.example/"])", json["audience"].dump());
  const ordered_json &report = json["report"];
  EXPECT_TRUE(report["accepted"].is_null());
  EXPECT_EQ("passed", OutcomeIn(report, "well-formed"));
  EXPECT_EQ("failed", OutcomeIn(report, "form"));
  EXPECT_FALSE(CheckIn(report, "form")["findings"].empty());
  EXPECT_EQ("passed", OutcomeIn(report, "digests"));
  EXPECT_EQ("not done", OutcomeIn(report, "signature"));
  EXPECT_EQ("http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", report["algorithm"]);
  EXPECT_EQ("CN=sts,O=Example", report["namedCertificates"].at(0)["subject"]);
  EXPECT_EQ(R"({"issuer":"https://idp.partner.example/sts","issueInstant":"2020-01-01T00:00:00.000Z",)"
            R"("nameId":"CN=alice,OU=people",)"
            R"("nameIdFormat":"urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified",)"
            R"("confirmationMethod":"urn:oasis:names:tc:SAML:2.0:cm:sender-vouches"})",
            report["claims"].dump());
}

TEST(Inspect, ShowsTheTokenOfAnotherMakersService) {
  ExpectForeignToken(InspectJson("../foreign/saml2.xml"));
}

TEST(Inspect, ShowsAnAssertionWithinAMessage) {
  ExpectForeignToken(InspectJson("../foreign/in-envelope.xml"));
}

TEST(Inspect, ShowsThePlaceOfEachDeviation) {
  const ordered_json form = CheckIn(InspectJson("../foreign/saml2.xml")["report"], "form");
  std::vector<std::string> paths;
  for (const auto &finding : form["findings"]) {
    EXPECT_FALSE(finding["path"].is_null()) << finding;
    EXPECT_FALSE(finding["line"].is_null()) << finding;
    EXPECT_FALSE(finding["column"].is_null()) << finding;
    paths.push_back(finding["path"].get<std::string>());
  }
  EXPECT_THAT(paths, testing::IsSupersetOf({"/saml2:Assertion"}));
}

TEST(Inspect, ShowsUnknownForFactsThatAForeignTokenLacks) {
  const Result result = RunTool({"inspect", "../foreign/saml2.xml"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_THAT(result.out, HasSubstr("\nSubject:         unknown\n"));
  EXPECT_THAT(result.out, HasSubstr("\nConfirmation:    unknown\n"));
  EXPECT_THAT(result.out, HasSubstr("\nName:            CN=alice,OU=people\n"));
  EXPECT_THAT(result.out, HasSubstr("\nMethod:          urn:oasis:names:tc:SAML:2.0:cm:sender-vouches\n"));
  EXPECT_THAT(result.out, HasSubstr("\nIn the token:    CN=sts,O=Example\n"));
}

TEST(Inspect, ShowsAnAssertionOfAnEarlierVersion) {
  const ordered_json shown = InspectJson("../foreign/saml-1.1.xml");
  EXPECT_EQ(false, shown["verified"]);
  EXPECT_TRUE(shown["id"].is_null());
  EXPECT_EQ("Element 'saml1:Assertion' has unexpected namespace",
            CheckIn(shown["report"], "form")["findings"].at(0)["message"]);
}

TEST(Inspect, ShowsOrRefusesEachAttackAndNeverFails) {
  for (const auto &entry : std::filesystem::directory_iterator(Testing::DataPath("attacks"))) {
    if (entry.path().extension() != ".xml") {
      continue;
    }
    SCOPED_TRACE(entry.path().filename());
    const Result result = RunTool({"inspect", "--format", "json", entry.path()});
    ASSERT_TRUE(result.exitCode == 0 || result.exitCode == 5) << result.exitCode;
    const std::string &shown = result.exitCode == 0 ? result.out : result.err;
    EXPECT_EQ("", result.exitCode == 0 ? result.err : result.out);
    EXPECT_TRUE(IsAscii(shown)) << shown;
    EXPECT_EQ(1, ordered_json::parse(shown)["schema"]);
  }
}

TEST(Inspect, ReadsStandardInputAndPrintsXmlUnchanged) {
  const std::string token = ReadDataFile("tokens/style-pretty.xml");
  ExpectResult(RunTool({"inspect", "--format", "xml", "-"}, token), 0, token, "");
  const std::string foreign = ReadDataFile("foreign/in-envelope.xml");
  ExpectResult(RunTool({"inspect", "--format", "xml", "-"}, foreign), 0, foreign, "");
}

TEST(Inspect, EscapesControlCharacters) {
  std::string token = ReadDataFile("tokens/bearer-minimal.xml");
  const std::string alice = ">alice@";
  // A line feed that would fake a line, the C1 control that starts terminal sequences, and a change of direction.
  token.replace(token.find(alice), alice.size(), ">a\nVerified: yes\xC2\x9B\xE2\x80\xAE\xF0\x9F\x99\x82\xC3\xA9@");
  const Result text = RunTool({"inspect", "-"}, token);
  EXPECT_EQ(0, text.exitCode);
  EXPECT_NE(std::string::npos,
            text.out.find("\nSubject:         a\\u000AVerified: yes\\u009B\\u202E\xF0\x9F\x99\x82\xC3\xA9@"))
      << text.out;
  for (const char *control : {"\xC2\x9B", "\xE2\x80\xAE", "\nVerified: yes"}) {
    EXPECT_THAT(text.out, Not(HasSubstr(control)));
  }
  const Result json = RunTool({"inspect", "--format", "json", "-"}, token);
  EXPECT_NE(std::string::npos, json.out.find(R"("name": "a\nVerified: yes\u009b\u202e\ud83d\ude42\u00e9")"))
      << json.out;
  EXPECT_TRUE(IsAscii(json.out));
}

TEST(Inspect, EscapesHostileNamesAndValuesOfDeviations) {
  std::string token = ReadDataFile("foreign/saml2.xml");
  const std::string version = "Version=\"2.0\"";
  token.replace(token.find(version), version.size(),
                "Version=\"&#x9B;2J&#10;Verified: yes\xE2\x80\xAE\" Versi\xC3\xB3n=\"&#xD;\"");
  const Result text = RunTool({"inspect", "-"}, token);
  EXPECT_EQ(0, text.exitCode);
  for (const char *control : {"\xC2\x9B", "\xE2\x80\xAE", "\nVerified: yes", "\r", "\033"}) {
    EXPECT_THAT(text.out, Not(HasSubstr(control)));
  }
  const Result json = RunTool({"inspect", "--format", "json", "-"}, token);
  EXPECT_TRUE(IsAscii(json.out));
}

} // namespace
} // namespace ToolTest
