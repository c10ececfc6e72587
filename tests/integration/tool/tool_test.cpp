// SPDX-License-Identifier: Apache-2.0
// What the tool prints, and its exit codes.

#include "expect_result.h"
#include "expected_output.h"
#include "process.h"
#include "refusals.h"
#include "token_values.h"

#include "support/data_file.h"

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <vector>

namespace ToolTest {
namespace {

using Testing::ReadDataFile;

TEST(Verify, ShowsAVerifiedTokenAsText) {
  Result result = RunTool({"verify", "--trust", "sts-rsa.crt", "full.xml"});
  result.out = WithoutDistances(result.out);
  ExpectResult(result, 0, "Verified:        yes\n" + Expected("full.txt"), "");
}

TEST(Verify, ShowsAVerifiedTokenAsJson) {
  ExpectResult(RunTool({"verify", "--format", "json", "--trust", "sts-rsa.crt", "full.xml"}), 0,
               ExpectedJson("full.json", true), "");
}

TEST(Verify, ShowsATokenWithoutOptionalPartsAsJson) {
  ExpectResult(RunTool({"verify", "--format", "json", "--trust", "sts-rsa.crt", "bearer-minimal.xml"}), 0,
               ExpectedJson("minimal.json", true), "");
}

TEST(Verify, PrintsTheTokenItselfAsXml) {
  ExpectResult(RunTool({"verify", "--format", "xml", "--trust", "sts-rsa.crt", "style-pretty.xml"}), 0,
               ReadDataFile("tokens/style-pretty.xml"), "");
}

TEST(Verify, ReadsStandardInputForADash) {
  ExpectResult(
      RunTool({"verify", "--format", "json", "--trust", "sts-rsa.crt", "-"}, ReadDataFile("tokens/bearer-minimal.xml")),
      0, ExpectedJson("minimal.json", true), "");
}

TEST(Verify, TrustsTheKeysOfAllTrustFiles) {
  EXPECT_EQ(
      0, RunTool({"verify", "--trust", "sts-rsa.crt", "--trust", "sts-ec256.crt", "ecdsa-p256-sha256.xml"}).exitCode);
  EXPECT_EQ(0, RunTool({"verify", "--trust", "sts-bundle.pem", "signed-by-second.xml"}).exitCode);
  EXPECT_EQ(0, RunTool({"verify", "--trust", "sts-rsa.der", "bearer.xml"}).exitCode);
}

constexpr const char *EXPIRED_WARNING =
    "ssoclient: warning: the trusted certificate CN=sts expired,O=Example is not valid after "
    "2021-01-01T00:00:00.000Z; its key is trusted all the same\n";

TEST(Verify, WarnsOfATrustedCertificateThatIsOutOfDateAndTrustsItsKey) {
  const Result result = RunTool({"verify", "--trust", "sts-rsa-expired.crt", "bearer-minimal.xml"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ(EXPIRED_WARNING, result.err);
}

TEST(Verify, WarnsInJsonOnlyWhenAskedTo) {
  const std::vector<std::string> line = {
      "verify", "--format", "json", "--trust", "sts-rsa-expired.crt", "bearer-minimal.xml"};
  ExpectResult(RunTool(line), 0, ExpectedJson("minimal.json", true), "");
  std::vector<std::string> verbose = line;
  verbose.push_back("-v");
  ExpectResult(RunTool(verbose), 0, ExpectedJson("minimal.json", true), EXPIRED_WARNING);
}

TEST(Verify, AppliesTheTolerance) {
  // The token expired on 2021-01-01; the tolerance is 200 years.
  EXPECT_EQ(0, RunTool({"verify", "--tolerance", "6307200000", "--trust", "sts-rsa.crt", "expired.xml"}).exitCode);
  EXPECT_EQ(5, RunTool({"verify", "--tolerance", "-6307200000", "--trust", "sts-rsa.crt", "bearer.xml"}).exitCode);
}

struct Refusal {
  const char *name;
  std::vector<std::string> arguments;
  int exitCode;
  const char *exceptionClass;
  const char *label;
  const char *message; ///< contains no character that JSON escapes
};

const Refusal REFUSALS[] = {
    {"ExpiredToken",
     {"--trust", "sts-rsa.crt", "expired.xml"},
     5,
     "ParseException",
     "token invalid",
     "The token has expired at: 2021-01-01T00:00:00.000Z"},
    {"EarlyToken",
     {"--trust", "sts-rsa.crt", "early.xml"},
     5,
     "ParseException",
     "token invalid",
     "Token start date is in the future: 2110-01-01T00:00:00.000Z"},
    {"ForeignSigner",
     {"--trust", "sts-rsa.crt", "signed-by-other.xml"},
     6,
     "InvalidSignatureException",
     "signature invalid",
     "Failed to verify signature: token might have been tampered with."},
    {"TokenThatIsNotXml",
     {"--trust", "sts-rsa.crt", "sts-rsa.crt"},
     5,
     "XMLParseException",
     "token invalid",
     "text comes before the document element at line 1, column 1"},
    {"TokenThatIsAnotherDocument",
     {"--trust", "sts-rsa.crt", "../attacks/other-root.xml"},
     5,
     "ParseException",
     "token invalid",
     "Expected element 'Assertion' not found."},
    {"TokenFileThatIsMissing",
     {"--trust", "sts-rsa.crt", "missing.xml"},
     7,
     "IOException",
     "file",
     "missing.xml: No such file or directory"},
    {"TokenFileThatIsAFolder",
     {"--trust", "sts-rsa.crt", "templates"},
     7,
     "IOException",
     "file",
     "templates: Is a directory"},
    {"TrustFileThatIsMissing",
     {"--trust", "missing.crt", "bearer.xml"},
     7,
     "IOException",
     "file",
     "Cannot open missing.crt: No such file or directory"},
    {"TrustFileWithoutCertificate",
     {"--trust", "make.sh", "bearer.xml"},
     7,
     "CryptoException",
     "key or certificate",
     "make.sh: There is no certificate in the text"},
    {"TrustFileWithAKey",
     {"--trust", "certificate-with-key.pem", "bearer.xml"},
     7,
     "CryptoException",
     "key or certificate",
     "certificate-with-key.pem: Holds a private key (PRIVATE KEY) where only certificates belong"},
    {"NoTrustFile", {"bearer.xml"}, 2, "UsageException", "usage", "--trust is required; see ssoclient --help"},
    {"NoToken", {"--trust", "sts-rsa.crt"}, 2, "UsageException", "usage", "FILE is required; see ssoclient --help"},
    {"ToleranceThatIsNotANumber",
     {"--tolerance", "1x", "--trust", "sts-rsa.crt", "bearer.xml"},
     2,
     "UsageException",
     "usage",
     "--tolerance: must be a whole number; see ssoclient --help"},
    {"UnknownOption",
     {"--nope", "--trust", "sts-rsa.crt", "bearer.xml"},
     2,
     "UsageException",
     "usage",
     "not expected: --nope; see ssoclient --help"},
};

const char *HintFor(const Refusal &refusal) {
  return IsAboutToken(refusal.exceptionClass) ? EXPLAIN_HINT : "";
}

class VerifyRefusal : public testing::TestWithParam<Refusal> {};

TEST_P(VerifyRefusal, IsALineOfTextAndAnExitCodeAndAHintIfItIsAboutTheToken) {
  std::vector<std::string> line = {"verify"};
  line.insert(line.end(), GetParam().arguments.begin(), GetParam().arguments.end());
  ExpectResult(RunTool(line), GetParam().exitCode, "",
               RefusalText(GetParam().label, GetParam().message, HintFor(GetParam())));
}

TEST_P(VerifyRefusal, IsOneJsonObjectAndTheSameExitCode) {
  std::vector<std::string> line = {"verify", "--format", "json"};
  line.insert(line.end(), GetParam().arguments.begin(), GetParam().arguments.end());
  ExpectResult(RunTool(line), GetParam().exitCode, "",
               RefusalJson(GetParam().exceptionClass, GetParam().message, HintFor(GetParam())));
}

INSTANTIATE_TEST_SUITE_P(Of, VerifyRefusal, testing::ValuesIn(REFUSALS),
                         [](const auto &refusal) { return std::string(refusal.param.name); });

TEST(Tool, EscapesControlCharactersAfterOctetsThatAreNotUtf8) {
  // Each lead octet announces more octets than follow. The escape character must not count as one of them.
  const std::string name = "missing\xC3\x1B[2J\xE2\x80\x1B[2J\xF0\x1B[2J\xF0\x9F\x1B";
  ExpectResult(RunTool({"inspect", name}), 7, "",
               "ssoclient: file: missing\xC3\\u001B[2J\xE2\\u0080\\u001B[2J\xF0\\u001B[2J\xF0\\u009F\\u001B: "
               "No such file or directory\n");
}

TEST(Tool, RefusesADocumentBeyondTheLimitWithoutReadingItAll) {
  // Twice the limit. The tool does not read all of it, so writing the rest may fail.
  const Result result = RunTool({"inspect", "-"}, "<x>" + std::string(32u * 1024 * 1024, 'a'));
  EXPECT_EQ(5, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_EQ(0u, result.err.find("ssoclient: token invalid: "));
}

TEST(Tool, ReportsAnOutputThatCannotBeWritten) {
  const Result result = RunShell("ssoclient inspect bearer.xml >/dev/full");
  ExpectResult(result, 7, "", "ssoclient: file: standard output: No space left on device\n");
}

TEST(Tool, EndsWith130WhenInterrupted) {
  const Result result = RunToolAndSignal({"inspect", "-"}, SIGINT);
  EXPECT_EQ(130, result.exitCode);
}

TEST(Tool, LeavesAnIgnoredInterruptIgnored) {
  const Result result = RunShell("trap '' INT; ssoclient inspect --format json bearer-minimal.xml & wait $!");
  ExpectResult({result.exitCode, WithoutReport(result.out), result.err}, 0, ExpectedJson("minimal.json", false), "");
}

TEST(Tool, PrintsItsVersion) {
  ExpectResult(RunTool({"--version"}), 0, "ssoclient " SSOCLIENT_VERSION "\n", "");
}

TEST(Tool, RequiresACommand) {
  ExpectResult(RunTool({}), 2, "", "ssoclient: usage: A subcommand is required; see ssoclient --help\n");
}

TEST(Tool, ReportsAnUnknownCommandOrOption) {
  ExpectResult(RunTool({"bogus", "token.xml"}), 2, "",
               "ssoclient: usage: unknown command or option 'bogus'; see ssoclient --help\n");
  ExpectResult(RunTool({"--bogus"}), 2, "",
               "ssoclient: usage: unknown command or option '--bogus'; see ssoclient --help\n");
}

TEST(Tool, RefusesAnUnknownFormat) {
  ExpectResult(RunTool({"inspect", "--format", "yaml", "bearer.xml"}), 2, "",
               "ssoclient: usage: --format: yaml not in {text,json,xml}; see ssoclient --help\n");
}

TEST(Tool, ListsItsCommandsAndExitCodesInTheHelp) {
  const Result result = RunTool({"--help"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  for (const char *command :
       {"acquire", "token", "renew", "validate", "verify", "inspect", "sign", "check-message", "doctor", "dialect"}) {
    EXPECT_NE(std::string::npos, result.out.find(std::string("\n  ") + command + " ")) << command;
  }
  EXPECT_NE(std::string::npos, result.out.find(R"(Exit codes:
  0    done; for validate: the token is valid
  1    unexpected failure
  2    wrong command line
  3    credentials missing, expired, or refused by the service
  4    communication with the service failed
  5    token or message invalid or expired; for validate: the verdict
  6    signature or proof invalid
  7    a file, key, certificate or passphrase
  8    any other failure that the service reports
  130  interrupted
)"));
}

// A value of 15 MiB is cut in text, which people read, and whole in JSON, which programs read.

const std::string LONG_VALUE(15u * 1024 * 1024, 'x');

std::string WithLongValue(const std::string &from) {
  std::string token = ReadDataFile("tokens/bearer.xml");
  return token.replace(token.find(from), from.size(), LONG_VALUE);
}

TEST(LongValues, AreCutInALineAboutAFailureAndWholeInItsJson) {
  const std::string token = WithLongValue("urn:oasis:names:tc:SAML:2.0:cm:bearer");
  const std::string message = "Unknown subject confirmation method: '";
  const Result text = RunTool({"verify", "--trust", "sts-rsa.crt", "-"}, token);
  EXPECT_EQ(5, text.exitCode);
  EXPECT_TRUE(text.err ==
              RefusalText("token invalid",
                          message + std::string(1024 - message.size(), 'x') + "... (" +
                              std::to_string(message.size() + LONG_VALUE.size() + 1 - 1024) + " more bytes)",
                          EXPLAIN_HINT))
      << text.err.size() << " " << text.err.substr(0, 100);
  EXPECT_LT(text.err.size(), 2u * 1024);
  const Result json = RunTool({"verify", "--format", "json", "--trust", "sts-rsa.crt", "-"}, token);
  EXPECT_NE(std::string::npos, json.err.find(LONG_VALUE));
}

TEST(LongValues, AreCutAfterTheyHaveBeenEscaped) {
  std::string token = ReadDataFile("tokens/bearer.xml");
  const std::string method = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
  std::string tabs;
  for (int count = 0; count < 100'000; ++count) {
    tabs += "&#9;";
  }
  token.replace(token.find(method), method.size(), tabs);
  const Result text = RunTool({"verify", "--trust", "sts-rsa.crt", "-"}, token);
  EXPECT_EQ(5, text.exitCode);
  EXPECT_LT(text.err.size(), 2u * 1024);
}

TEST(LongValues, AreCutInTheTextOfATokenAndWholeInItsJson) {
  const std::string token = WithLongValue("https://files.corp.example/");
  const Result text = RunTool({"inspect", "-"}, token);
  EXPECT_EQ(0, text.exitCode);
  EXPECT_TRUE(text.out.find("\nAudience:        " + std::string(1024, 'x') + "... (15727616 more bytes)\n") !=
              std::string::npos);
  EXPECT_LT(text.out.size(), 4u * 1024);
  const Result json = RunTool({"inspect", "--format", "json", "-"}, token);
  EXPECT_NE(std::string::npos, json.out.find(LONG_VALUE));
}

} // namespace
} // namespace ToolTest
