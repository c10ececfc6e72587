// SPDX-License-Identifier: Apache-2.0
// `verify --explain` shows each check of a token, and ends with the same exit code and refusal as `verify`.

#include "expect_result.h"
#include "expected_output.h"
#include "process.h"
#include "refusals.h"
#include "terminal.h"

#include "support/data_file.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <sstream>
#include <string>
#include <vector>

namespace ToolTest {
namespace {

using nlohmann::ordered_json;
using testing::HasSubstr;
using testing::MatchesRegex;
using testing::Not;
using testing::StartsWith;

std::vector<std::string> Explain(const std::string &file, const std::vector<std::string> &more = {}) {
  std::vector<std::string> words = {"verify", "--explain", "--trust", "sts-rsa.crt", file};
  words.insert(words.end(), more.begin(), more.end());
  return words;
}

TEST(VerifyExplain, ShowsAnAcceptedTokenAndThatEachCheckHasPassed) {
  const Result result = RunTool(Explain("full.xml"));
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(WithoutDistances(result.out), StartsWith("Verified:        yes\n" + Expected("full.txt") + "\nIssuer: "));
  EXPECT_THAT(result.out, HasSubstr("\nCheck                  Outcome  What was found"));
  std::size_t count = 0;
  for (std::size_t at = 0; (at = result.out.find("  passed   ", at)) != std::string::npos; ++at) {
    ++count;
  }
  EXPECT_EQ(14u, count) << result.out;
  EXPECT_THAT(result.out, HasSubstr("made the signature"));
}

TEST(VerifyExplain, ShowsWhyATokenIsRefusedAndNothingThatItStates) {
  const Result result = RunTool(Explain("expired.xml"));
  EXPECT_EQ(5, result.exitCode);
  EXPECT_EQ("ssoclient: token invalid: The token has expired at: 2021-01-01T00:00:00.000Z\n", result.err);
  EXPECT_THAT(result.out, StartsWith("Verified:        no\n\n"));
  EXPECT_THAT(result.out, HasSubstr("\nvalidity               failed"));
  EXPECT_THAT(result.out, HasSubstr("The token has expired"));
  EXPECT_THAT(result.out, HasSubstr("missed by "));
  EXPECT_THAT(result.out, Not(HasSubstr("Subject:")));
  EXPECT_THAT(result.out, Not(HasSubstr("Group:")));
}

struct Refused {
  const char *file;
  int exitCode;
};

TEST(VerifyExplain, EndsLikeVerifyAndReportsTheSameRefusal) {
  for (const Refused &refused :
       {Refused{"expired.xml", 5}, Refused{"early.xml", 5}, Refused{"signed-by-other.xml", 6},
        Refused{"sts-rsa.crt", 5}, Refused{"../attacks/other-root.xml", 5}, Refused{"../foreign/saml2.xml", 5},
        Refused{"../attacks/value-zeros.xml", 6}, Refused{"missing.xml", 7}}) {
    SCOPED_TRACE(refused.file);
    const Result plain = RunTool({"verify", "--trust", "sts-rsa.crt", refused.file});
    const Result text = RunTool(Explain(refused.file));
    EXPECT_EQ(refused.exitCode, plain.exitCode);
    EXPECT_EQ(refused.exitCode, text.exitCode);
    EXPECT_EQ(plain.err.substr(0, plain.err.find('\n')), text.err.substr(0, text.err.find('\n')));
    const Result json = RunTool(Explain(refused.file, {"--format", "json"}));
    EXPECT_EQ(refused.exitCode, json.exitCode);
    if (refused.exitCode != 7) {
      const ordered_json report = ordered_json::parse(json.out)["report"];
      EXPECT_EQ(false, report["accepted"]);
      EXPECT_EQ(ordered_json::parse(json.err)["error"]["message"], report["refusal"]);
    }
  }
}

TEST(VerifyExplain, ShowsAnAcceptedTokenAsJson) {
  const Result result = RunTool(Explain("full.xml", {"--format", "json"}));
  ExpectResult({result.exitCode, WithoutReport(result.out), result.err}, 0, ExpectedJson("full.json", true), "");
  const ordered_json report = ordered_json::parse(result.out)["report"];
  EXPECT_EQ(true, report["accepted"]);
  EXPECT_TRUE(report["refusal"].is_null());
  EXPECT_EQ(14u, report["checks"].size());
  EXPECT_EQ(true, report["keys"].at(0)["madeSignature"]);
  EXPECT_EQ(true, report["references"].at(0)["coversToken"]);
}

TEST(VerifyExplain, ShowsNoFactOfARefusedTokenInJson) {
  const Result result = RunTool(Explain("expired.xml", {"--format", "json"}));
  const ordered_json json = ordered_json::parse(result.out);
  EXPECT_EQ(26u, json.size());
  for (const auto &item : json.items()) {
    const bool isAboutTheCheck = item.key() == "schema" || item.key() == "verified" || item.key() == "report";
    EXPECT_NE(isAboutTheCheck, item.value().is_null()) << item.key();
  }
}

TEST(VerifyExplain, ShowsAForeignCertificateInTheToken) {
  const Result result = RunTool(Explain("../attacks/foreign-certificate.xml", {"--format", "json"}));
  EXPECT_EQ(6, result.exitCode);
  const ordered_json report = ordered_json::parse(result.out)["report"];
  EXPECT_EQ(false, report["namedCertificates"].at(0)["trusted"]);
  EXPECT_EQ(false, report["keys"].at(0)["madeSignature"]);
}

TEST(VerifyExplain, HasNoXmlForm) {
  ExpectResult(RunTool(Explain("full.xml", {"--format", "xml"})), 2, "",
               "ssoclient: usage: --explain has no XML form; give --format text or json\n");
}

TEST(VerifyExplain, IsPlainInAPipe) {
  EXPECT_THAT(RunShell("TERM=xterm ssoclient verify --explain --trust sts-rsa.crt expired.xml | cat").out,
              Not(HasSubstr("\033")));
}

TEST(VerifyExplain, UsesTheWidthInColumns) {
  const auto widest = [](const std::string &columns) {
    std::istringstream lines(
        RunShell(columns + " ssoclient verify --explain --trust sts-rsa.crt ../foreign/saml2.xml").out);
    std::size_t width = 0;
    bool isInTable = false;
    for (std::string line; std::getline(lines, line);) {
      isInTable = isInTable || line.rfind("Check ", 0) == 0;
      width = isInTable ? std::max(width, line.size()) : width;
    }
    return width;
  };
  EXPECT_LE(widest("COLUMNS=60"), 60u);
  EXPECT_LE(widest("unset COLUMNS;"), 100u);
  EXPECT_GT(widest("unset COLUMNS;"), 60u);
  EXPECT_GT(widest("COLUMNS=400"), 100u);
}

/// What the tool shows at a terminal, with `environment` before the command.
std::string AtATerminal(const std::string &environment) {
  TerminalSession session(
      ShellCommand(environment + " exec ssoclient verify --explain --trust sts-rsa.crt expired.xml"),
      Testing::DataPath("tokens"));
  EXPECT_EQ(5, session.Finish());
  return session.Shown();
}

TEST(VerifyExplain, IsColouredAtATerminal) {
  const std::string shown = AtATerminal("unset NO_COLOR; TERM=xterm");
  EXPECT_THAT(shown, HasSubstr("\033[31mfailed\033[0m"));
  EXPECT_THAT(shown, HasSubstr("\033[32mpassed\033[0m"));
}

TEST(VerifyExplain, IsPlainWhenNoColorIsSetOrTheTerminalIsDumb) {
  EXPECT_THAT(AtATerminal("NO_COLOR=1 TERM=xterm"), Not(HasSubstr("\033")));
  EXPECT_THAT(AtATerminal("unset NO_COLOR; TERM=dumb"), Not(HasSubstr("\033")));
  EXPECT_THAT(AtATerminal("NO_COLOR= TERM=xterm"), HasSubstr("\033[31mfailed"));
}

TEST(VerifyDemands, RefuseAnotherAudience) {
  const std::vector<std::string> line = {"verify", "--trust", "sts-rsa.crt", "full.xml", "--accept-audience"};
  const auto with = [&](const std::vector<std::string> &more) {
    std::vector<std::string> words = line;
    words.insert(words.end(), more.begin(), more.end());
    return RunTool(words);
  };
  ExpectResult(with({"https://other.example/"}), 5, "",
               RefusalText("token invalid",
                           "The token is restricted to other audiences: https://files.corp.example/, "
                           "https://mail.corp.example/",
                           EXPLAIN_HINT));
  EXPECT_EQ(0, with({"https://other.example/", "--accept-audience", "https://mail.corp.example/"}).exitCode);
}

TEST(VerifyDemands, AcceptATokenForEveryAudience) {
  EXPECT_EQ(0, RunTool({"verify", "--trust", "sts-rsa.crt", "bearer-minimal.xml", "--accept-audience",
                        "https://other.example/"})
                   .exitCode);
}

TEST(VerifyDemands, RefuseAnotherConfirmation) {
  ExpectResult(
      RunTool({"verify", "--trust", "sts-rsa.crt", "bearer.xml", "--require", "holder-of-key"}), 5, "",
      RefusalText("token invalid", "The token's confirmation is bearer, but holder-of-key is required", EXPLAIN_HINT));
  ExpectResult(
      RunTool({"verify", "--trust", "sts-rsa.crt", "full.xml", "--require", "bearer"}), 5, "",
      RefusalText("token invalid", "The token's confirmation is holder-of-key, but bearer is required", EXPLAIN_HINT));
  EXPECT_EQ(0, RunTool({"verify", "--trust", "sts-rsa.crt", "bearer.xml", "--require", "bearer"}).exitCode);
  EXPECT_EQ(0, RunTool({"verify", "--trust", "sts-rsa.crt", "full.xml", "--require", "holder-of-key"}).exitCode);
}

TEST(VerifyDemands, RefuseAnUnknownConfirmation) {
  ExpectResult(RunTool({"verify", "--trust", "sts-rsa.crt", "bearer.xml", "--require", "none"}), 2, "",
               "ssoclient: usage: --require: none not in {bearer,holder-of-key}; see ssoclient --help\n");
}

TEST(VerifyDemands, AreExplained) {
  const Result result = RunTool(Explain("bearer.xml", {"--require", "holder-of-key", "--format", "json"}));
  EXPECT_EQ(5, result.exitCode);
  EXPECT_EQ("The token's confirmation is bearer, but holder-of-key is required",
            ordered_json::parse(result.out)["report"]["refusal"].get<std::string>());
}

} // namespace
} // namespace ToolTest
