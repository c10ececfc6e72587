// SPDX-License-Identifier: Apache-2.0
// `--profile` chooses which form of token is accepted, and hints state whether the other profile accepts a token.

#include "expect_result.h"
#include "process.h"
#include "service_test.h"

#include "support/data_file.h"
#include "unit/token/assertion_text.h"
#include "unit/token/signed_assertion.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <string>
#include <vector>

namespace ToolTest {
namespace {

using nlohmann::ordered_json;
using testing::HasSubstr;
using testing::Not;
using Testing::ReadDataFile;
using Testing::ReplaceOnce;

constexpr const char *EXPLAIN_HINT = "ssoclient verify --explain shows each check of the token, and what to do";
constexpr const char *STRICT_REFUSAL =
    "ssoclient: token invalid: Unexpected attributes on element 'saml2:Assertion'\nssoclient: hint: ";

constexpr const char *VOUCHED = "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches";

/// The token of another maker's service, with a bearer confirmation that states a recipient, a request and an address.
std::string ForeignToken() {
  std::string token = ReplaceOnce(ReadDataFile("foreign/saml2.xml"), VOUCHED, "urn:oasis:names:tc:SAML:2.0:cm:bearer");
  token = ReplaceOnce(token, " Recipient=\"https://files.corp.example/\"",
                      " Recipient=\"https://files.corp.example/\" InResponseTo=\"_7\" Address=\"192.0.2.7\"");
  return Testing::SignAgain(token);
}

Result Verify(const std::vector<std::string> &more, const std::string &token = ForeignToken()) {
  std::vector<std::string> words = {"verify", "--trust", "sts-rsa.crt"};
  words.insert(words.end(), more.begin(), more.end());
  words.push_back("-");
  return RunTool(words, token);
}

TEST(Profile, Saml2AcceptsATokenThatStrictRefuses) {
  ExpectResult(Verify({}), 5, "",
               std::string(STRICT_REFUSAL) + "--profile saml2 accepts this token; " + EXPLAIN_HINT + "\n");
  const Result result = Verify({"--profile", "saml2"});
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(result.out, HasSubstr("\nSubject:         CN=alice,OU=people@nameid:unspecified;name-qualifier="
                                    "https://idp.partner.example/\nConfirmation:    bearer\n"
                                    "Recipient:       https://files.corp.example/\nIn response to:  _7\n"
                                    "Sender address:  192.0.2.7\nNot before: "));
  EXPECT_THAT(result.out, HasSubstr("\nSession:         42\nAttribute:       role\n                 = auditor\n"));
}

TEST(Profile, StrictIsTheDefault) {
  EXPECT_EQ(Verify({}).err, Verify({"--profile", "strict"}).err);
}

TEST(Profile, IsRefusedIfItIsUnknown) {
  ExpectResult(Verify({"--profile", "lax"}), 2, "",
               "ssoclient: usage: --profile: lax not in {strict,saml2}; see ssoclient --help\n");
}

TEST(Profile, HintStatesWhySaml2AlsoRefusesTheToken) {
  const std::string refusal = std::string("Unknown subject confirmation method: '") + VOUCHED + "'";
  ExpectResult(Verify({}, ReadDataFile("foreign/saml2.xml")), 5, "",
               std::string(STRICT_REFUSAL) + "--profile saml2 does not accept this token either: " + refusal + "; " +
                   EXPLAIN_HINT + "\n");
  ExpectResult(Verify({"--profile", "saml2"}, ReadDataFile("foreign/saml2.xml")), 5, "",
               "ssoclient: token invalid: " + refusal + "\nssoclient: hint: " + EXPLAIN_HINT + "\n");
}

TEST(Profile, HintDoesNotMentionAProfileThatRefusesForTheSameReason) {
  ExpectResult(Verify({}, ReadDataFile("tokens/expired.xml")), 5, "",
               "ssoclient: token invalid: The token has expired at: 2021-01-01T00:00:00.000Z\nssoclient: hint: " +
                   std::string(EXPLAIN_HINT) + "\n");
}

TEST(Profile, HintIsPrintable) {
  const std::string token = ReplaceOnce(ReadDataFile("foreign/saml2.xml"), VOUCHED,
                                        "urn:\xC2\x9B"
                                        "2J");
  EXPECT_THAT(Verify({}, token).err, HasSubstr("confirmation method: 'urn:\\u009B2J'; "));
  EXPECT_THAT(Verify({}, token).err, Not(HasSubstr("\xC2\x9B")));
}

TEST(Profile, Saml2ChecksTheConfirmationAgainstTheOptions) {
  const std::vector<std::string> fitting = {
      "--profile",        "saml2", "--recipient",      "urn:other", "--recipient", "https://files.corp.example/",
      "--in-response-to", "_7",    "--sender-address", "192.0.2.7"};
  EXPECT_EQ(0, Verify(fitting).exitCode);
  const auto refusal = [](const char *option, const char *value) {
    const Result result = Verify({"--profile", "saml2", option, value});
    EXPECT_EQ(5, result.exitCode);
    return result.err.substr(0, result.err.find('\n'));
  };
  EXPECT_EQ("ssoclient: token invalid: The subject confirmation is for another recipient: https://files.corp.example/",
            refusal("--recipient", "urn:other"));
  EXPECT_EQ("ssoclient: token invalid: The subject confirmation answers another request: _7",
            refusal("--in-response-to", "_8"));
  EXPECT_EQ("ssoclient: token invalid: The subject confirmation is for a sender with another address: 192.0.2.7",
            refusal("--sender-address", "192.0.2.8"));
}

TEST(Profile, StrictRefusesOptionsThatItCannotCheck) {
  for (const std::string option : {"--recipient", "--in-response-to", "--sender-address"}) {
    ExpectResult(Verify({option, "urn:x"}), 2, "",
                 "ssoclient: usage: " + option +
                     " needs --profile saml2; tokens of the profile strict do not state it\n");
  }
}

TEST(Profile, OfTheOptionIsUsedForReports) {
  const std::string token = ForeignToken();
  const ordered_json strict = ordered_json::parse(RunTool({"inspect", "--format", "json", "-"}, token).out);
  const ordered_json saml2 =
      ordered_json::parse(RunTool({"inspect", "--profile", "saml2", "--format", "json", "-"}, token).out);
  EXPECT_EQ("failed", strict["report"]["checks"][1]["outcome"]);
  EXPECT_EQ("passed", saml2["report"]["checks"][1]["outcome"]);
  EXPECT_THAT(strict["report"]["checks"][1]["summary"].get<std::string>(), HasSubstr(" The profile SAML2 reads it."));
  EXPECT_EQ(strict["nameId"], saml2["nameId"]);
  EXPECT_EQ("CN=alice,OU=people", saml2["nameId"]["value"]);
  EXPECT_EQ(true, strict["confirmations"][0]["used"]);
  const Result explained = Verify({"--profile", "saml2", "--explain", "--format", "json"}, token);
  EXPECT_EQ(0, explained.exitCode);
  EXPECT_EQ(true, ordered_json::parse(explained.out)["report"]["accepted"]);
}

class ProfileOfService : public ServiceTest {};

TEST_F(ProfileOfService, IsUsedForGivenAndIssuedTokens) {
  const std::string saml2 = "--profile saml2 ";
  EXPECT_EQ(0, Run("ssoclient acquire " + Service() + saml2 + IDENTITY + "--renewable --out token.xml").exitCode);
  EXPECT_EQ(0, Run("ssoclient renew " + Service() + saml2 + IDENTITY + "--out renewed.xml token.xml").exitCode);
  EXPECT_EQ(0, Run("ssoclient validate " + Service() + saml2 + "token.xml").exitCode);
  m_folder.Write("foreign.xml", ForeignToken());
  std::filesystem::copy_file(Testing::DataPath("tokens/sts-rsa.crt"), m_folder / "other.pem");
  const std::string both = "--trust other.pem ";
  for (const std::string &command : {std::string("validate "), std::string("renew ") + IDENTITY}) {
    const Result strict = Run("ssoclient " + command + Service() + both + "foreign.xml");
    EXPECT_EQ(5, strict.exitCode) << command;
    EXPECT_THAT(strict.err, HasSubstr("hint: --profile saml2 accepts this token; ")) << command;
    const Result accepted = Run("ssoclient " + command + Service() + both + saml2 + "foreign.xml");
    EXPECT_THAT(accepted.err, Not(HasSubstr("token invalid"))) << command; // the service does not trust the signer
  }
}

TEST_F(ProfileOfService, IsInTheHintAboutAnIssuedTokenThatIsRefused) {
  const std::string line = "ssoclient acquire " + Service("unknown-element") + PASSWORD;
  EXPECT_THAT(Run(line).err, HasSubstr("hint: --profile saml2 does not accept this token either: Unexpected content of "
                                       "element 'saml:Assertion': element saml:Surprise; --save-refused FILE keeps "));
  EXPECT_THAT(Run(line + "--profile saml2").err,
              HasSubstr("service fault: Unexpected content of element 'saml:Assertion': element saml:Surprise\n"
                        "ssoclient: hint: --save-refused FILE keeps "));
}

} // namespace
} // namespace ToolTest
