// SPDX-License-Identifier: Apache-2.0
// What `check-message` shows of a message, and what it refuses.

#include "message_test.h"
#include "token_values.h"

#include <tarvel/system/date_time.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <string>

namespace ToolTest {
namespace {

using nlohmann::ordered_json;
using testing::HasSubstr;

constexpr const char *NOT_SIGNED = "The message has no signature by the token's key";
constexpr const char *WRONG_SIGNATURE =
    "The signature of the message is wrong: another key made it, or signed content was changed";

class CheckMessage : public MessageTest {
protected:
  /// The message with a holder-of-key token, without the signature with the token's key.
  std::string SignAndRemoveTheSignature() const {
    const std::string message = Sign();
    const std::string token = m_folder.Read("token.xml");
    const std::size_t reference = message.find("#SAMLID");
    const std::size_t begin = message.rfind("<ds:Signature ", reference);
    const std::string end = "</ds:Signature>";
    return message.substr(0, begin) + message.substr(message.find(end, reference) + end.size());
  }

  std::string CoveredText() const {
    return "/s:Envelope/s:Header/wsse:Security/wsu:Timestamp\n                 "
           "/s:Envelope/s:Header/wsse:Security/saml:Assertion\n                 /s:Envelope/s:Body\n";
  }
};

/// `text` without the distances of times, such as " (in 4 min 59 s)".
std::string Timeless(std::string text) {
  for (std::size_t at = text.find(" ("); at != std::string::npos; at = text.find(" (", at + 1)) {
    text.erase(at, text.find(')', at) + 1 - at);
  }
  return text;
}

TEST_F(CheckMessage, ShowsWhatWasProvedAndTheToken) {
  const std::string message = Sign();
  const Result result = Check(message);
  ExpectResult({result.exitCode, Timeless(result.out), result.err}, 0,
               "Verified:        yes\nProof:           message-signature\nCovered:         " + CoveredText() +
                   "Created:         " + Between(message, "<wsu:Created>", "<") + "\nExpires:         " +
                   Between(message, "<wsu:Expires>", "<") + "\nReplay:          not-guarded\n\nToken\n" +
                   Timeless(Run("ssoclient verify --trust sts.pem token.xml").out),
               "");
}

TEST_F(CheckMessage, WritesJsonWithTheTokenAsVerifyWritesIt) {
  const std::string message = Sign("--token token.xml --key client.key --part {urn:example:trace}Trace envelope.xml");
  const Result result = Check(message, "--format json --part {urn:example:trace}Trace");
  EXPECT_EQ(0, result.exitCode) << result.err;
  ordered_json expected = {{"schema", 1},
                           {"verified", true},
                           {"proof", "message-signature"},
                           {"covered", ordered_json::array()},
                           {"created", Between(message, "<wsu:Created>", "<")},
                           {"expires", Between(message, "<wsu:Expires>", "<")},
                           {"replay", "not-guarded"}};
  expected["covered"] = {"/s:Envelope/s:Header/t:Trace", "/s:Envelope/s:Header/wsse:Security/wsu:Timestamp",
                         "/s:Envelope/s:Header/wsse:Security/saml:Assertion", "/s:Envelope/s:Body"};
  expected["token"] = ordered_json::parse(Run("ssoclient verify --trust sts.pem --format json token.xml").out);
  ordered_json actual = ordered_json::parse(result.out);
  EXPECT_THAT(actual["covered"], testing::UnorderedElementsAreArray(expected["covered"]));
  actual["covered"] = expected["covered"];
  EXPECT_EQ(expected.dump(2), actual.dump(2));
}

TEST_F(CheckMessage, ReadsStandardInput) {
  const Result result = Run("ssoclient sign --token token.xml --key client.key envelope.xml | "
                            "ssoclient check-message --trust sts.pem -");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_THAT(result.out, testing::StartsWith("Verified:        yes\nProof:           message-signature\n"));
}

TEST_F(CheckMessage, AcceptsABearerTokenOnlyIfAllowed) {
  const std::string message = Sign("--token bearer.xml envelope.xml");
  const Result result = Check(message, "--allow-bearer");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_THAT(result.out, testing::StartsWith("Verified:        yes\nProof:           bearer\n"
                                              "Covered:         nothing\n"));
  ExpectRefused(message, 6, "proof invalid", "The token is a bearer token, with which its sender proves nothing");
}

TEST_F(CheckMessage, AcceptsTheCertificateOfTheTlsConnectionAsProof) {
  const std::string message = SignAndRemoveTheSignature();
  const Result result = Check(message, "--peer-cert client.pem");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_THAT(result.out, testing::StartsWith("Verified:        yes\nProof:           tls-certificate\n"
                                              "Covered:         nothing\n"));
  ExpectRefused(message, 6, "proof invalid", NOT_SIGNED, "--allow-bearer");
  ExpectRefused(message, 6, "proof invalid",
                std::string(NOT_SIGNED) + ", and the key of the TLS certificate is another key",
                "--peer-cert other-client.pem");
}

TEST_F(CheckMessage, RequiresThatTheTokenIsSignedOnlyIfAsked) {
  const std::string message = Sign();
  EXPECT_EQ(0, Check(message, "--require-signed-token").exitCode);
  const std::string begin = "<ds:Reference URI=\"#" + Between(message, "#SAMLID\">", "<") + "\">";
  const std::string end = "</ds:Reference>";
  const std::size_t reference = message.rfind(begin);
  ASSERT_NE(std::string::npos, reference);
  m_folder.Write("template.xml",
                 message.substr(0, reference) + message.substr(message.find(end, reference) + end.size()));
  const Result result = Run("xmlsec1 --sign --privkey-pem client.key --id-attr:Id Timestamp --id-attr:Id Body "
                            "--node-xpath \"//*[local-name()='Security']/*[local-name()='Signature']\" template.xml");
  ASSERT_EQ(0, result.exitCode) << result.err;
  EXPECT_EQ(0, Check(result.out).exitCode);
  ExpectRefused(result.out, 5, "message invalid", "The signature does not cover the token", "--require-signed-token");
}

TEST_F(CheckMessage, RefusesChangedMessages) {
  const std::string message = Sign();
  ExpectRefused(Replaced(message, ">7<", ">8<"), 6, "proof invalid", WRONG_SIGNATURE);
  const Result json = Check(Replaced(message, ">7<", ">8<"), "--format json");
  ExpectResult(json, 6, "", RefusalJson("InvalidProofException", WRONG_SIGNATURE, MESSAGE_HINT));
}

TEST_F(CheckMessage, RefusesARefusedToken) {
  const std::string message = Sign();
  const Result changed = Check(Replaced(message, "client@corp.example", "admin@corp.example"));
  EXPECT_EQ(6, changed.exitCode);
  EXPECT_THAT(changed.err, testing::StartsWith("ssoclient: signature invalid: "));
  EXPECT_THAT(changed.err, testing::EndsWith("\nssoclient: hint: " + std::string(MESSAGE_HINT) + "\n"));
  const Result unknown = Check(Replaced(message, "<saml:AuthnStatement ", "<saml:Surprise/><saml:AuthnStatement "));
  EXPECT_EQ(5, unknown.exitCode);
  EXPECT_THAT(unknown.err, testing::StartsWith("ssoclient: token invalid: "));
  const Result untrusted = Run("ssoclient check-message --trust client.pem message.xml");
  EXPECT_NE(0, untrusted.exitCode);
}

TEST_F(CheckMessage, RefusesStaleMessages) {
  const std::string message = Sign();
  const std::string old = Replaced(Replaced(message, Between(message, "<wsu:Created>", "<"), "2020-01-01T00:00:00Z"),
                                   Between(message, "<wsu:Expires>", "<"), "2020-01-01T00:05:00Z");
  const Result stale = Check(old, "--format json");
  EXPECT_EQ(5, stale.exitCode);
  EXPECT_THAT(stale.err, HasSubstr("\"class\":\"StaleMessageException\""));
  EXPECT_THAT(Check(old).err, testing::StartsWith("ssoclient: message invalid: "));
}

// The time of the message is in the window of both options, and outside of it without them.
TEST_F(CheckMessage, AppliesTheToleranceAndTheLongestAge) {
  const std::string message = Sign("--token bearer.xml envelope.xml");
  const auto shifted = [&](int seconds) {
    const Tarvel::System::DateTime created(Between(message, "<wsu:Created>", "<"));
    const std::string from = created.PlusSeconds(seconds).ToString();
    return Replaced(Replaced(message, Between(message, "<wsu:Created>", "<"), from),
                    Between(message, "<wsu:Expires>", "<"), created.PlusSeconds(seconds + 7200).ToString());
  };
  EXPECT_EQ(5, Check(shifted(3000), "--allow-bearer").exitCode);
  EXPECT_EQ(0, Check(shifted(3000), "--allow-bearer --message-tolerance 3600").exitCode);
  EXPECT_EQ(5, Check(shifted(-3000), "--allow-bearer").exitCode);
  EXPECT_EQ(0, Check(shifted(-3000), "--allow-bearer --max-age 3600").exitCode);
  EXPECT_EQ(5, Check(shifted(-3000), "--allow-bearer --max-age 2000").exitCode);
}

TEST_F(CheckMessage, AcceptsAMessageWithoutATimestampOnlyIfAllowed) {
  const std::string message = Sign("--token bearer.xml envelope.xml");
  const std::size_t begin = message.find("<wsu:Timestamp");
  const std::string end = "</wsu:Timestamp>";
  const std::string without = message.substr(0, begin) + message.substr(message.find(end) + end.size());
  ExpectRefused(without, 5, "message invalid", "The security header has no timestamp", "--allow-bearer");
  const Result result = Check(without, "--allow-bearer --allow-no-timestamp");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_THAT(result.out, HasSubstr("\nCreated:         not stated\nExpires:         not stated\n"));
}

TEST_F(CheckMessage, RequiresThePartsThatAreAskedFor) {
  const std::string message = Sign();
  const Result uncovered = Check(message, "--part Plain");
  EXPECT_EQ(5, uncovered.exitCode);
  EXPECT_THAT(uncovered.err,
              testing::StartsWith("ssoclient: message invalid: The signature does not cover the header block "));
  const Result missing = Check(message, "--part {urn:x}Missing");
  EXPECT_EQ(5, missing.exitCode);
  EXPECT_THAT(missing.err, testing::StartsWith("ssoclient: message invalid: The message has no header block "));
}

TEST_F(CheckMessage, ReadsTheHeaderOfTheReceiverThatIsAskedFor) {
  const std::string message = Sign("--token token.xml --key client.key --actor urn:example:gateway envelope.xml");
  EXPECT_EQ(0, Check(message, "--actor urn:example:gateway").exitCode);
  ExpectRefused(message, 5, "message invalid", "There is no security header for the last receiver");
}

TEST_F(CheckMessage, RefusesATokenForAnotherAudience) {
  Acquire("limited.xml", std::string(IDENTITY) + "--audience https://files.corp.example/");
  const std::string message = Sign("--token limited.xml --key client.key envelope.xml");
  EXPECT_EQ(0, Check(message, "--accept-audience https://files.corp.example/").exitCode);
  const Result other = Check(message, "--accept-audience https://mail.corp.example/");
  EXPECT_EQ(5, other.exitCode);
  EXPECT_THAT(other.err, testing::StartsWith("ssoclient: token invalid: "));
}

TEST_F(CheckMessage, ExplainsAnAcceptedMessage) {
  const Result text = Check(Sign(), "--explain");
  EXPECT_EQ(0, text.exitCode);
  EXPECT_THAT(text.out, testing::StartsWith("Verified:        yes\n"));
  EXPECT_THAT(text.out, HasSubstr("\nThe message is accepted.\n"));
  const ordered_json json = ordered_json::parse(Check(Sign(), "--explain --format json").out);
  EXPECT_EQ(true, json["verified"]);
  EXPECT_EQ(true, json["report"]["accepted"]);
  EXPECT_TRUE(json["report"]["refusal"].is_null());
  EXPECT_EQ(json["covered"], json["report"]["covered"]);
  std::vector<std::string> names;
  for (const ordered_json &check : json["report"]["checks"]) {
    names.push_back(check["name"]);
    EXPECT_EQ("passed", check["outcome"]) << check;
  }
  EXPECT_THAT(names, testing::ElementsAre("well-formed", "envelope", "security-header", "timestamp", "token", "proof",
                                          "parts"));
  EXPECT_EQ(true, json["report"]["token"]["accepted"]);
}

TEST_F(CheckMessage, ExplainsARefusedMessageAndRefusesIt) {
  const std::string message = Replaced(Sign(), ">7<", ">8<");
  const Result text = Check(message, "--explain");
  EXPECT_EQ(6, text.exitCode);
  EXPECT_THAT(text.out, testing::StartsWith("Verified:        no\n\n"));
  EXPECT_THAT(text.out, HasSubstr(WRONG_SIGNATURE));
  EXPECT_EQ(text.err, "ssoclient: proof invalid: " + std::string(WRONG_SIGNATURE) + "\n");
  const Result json = Check(message, "--explain --format json");
  EXPECT_EQ(6, json.exitCode);
  EXPECT_EQ(json.err, RefusalJson("InvalidProofException", WRONG_SIGNATURE, ""));
  const ordered_json shown = ordered_json::parse(json.out);
  EXPECT_EQ(false, shown["verified"]);
  EXPECT_TRUE(shown["token"].is_null());
  EXPECT_EQ(WRONG_SIGNATURE, shown["report"]["refusal"]);
}

TEST_F(CheckMessage, RefusesWhatIsNotAMessage) {
  ExpectRefused("<s/>", 5, "message invalid", "The document is not a SOAP envelope");
  const Result malformed = Check("<s>");
  EXPECT_EQ(5, malformed.exitCode);
  EXPECT_THAT(malformed.err, testing::StartsWith("ssoclient: message invalid: "));
  EXPECT_EQ(malformed.err, Check("<s>", "--explain").err);
}

TEST_F(CheckMessage, RefusesAWrongCommandLineAndMissingFiles) {
  const auto expect = [this](const std::string &arguments, int exitCode, const std::string &line) {
    ExpectResult(Run("ssoclient check-message " + arguments), exitCode, "", "ssoclient: " + line + "\n");
  };
  expect("envelope.xml", 2, "usage: --trust is required; see ssoclient --help");
  expect("--trust sts.pem --format xml envelope.xml", 2,
         "usage: a checked message has no XML form; give --format text or json");
  expect("--trust sts.pem --max-age 0 envelope.xml", 2,
         "usage: --max-age: must be a number from 1 to 86400; see ssoclient --help");
  expect("--trust sts.pem --message-tolerance -1 envelope.xml", 2,
         "usage: --message-tolerance: must be a number from 0 to 86400; see ssoclient --help");
  expect("--trust sts.pem --part } envelope.xml", 2, "usage: --part must be {NAMESPACE}NAME, which '}' is not");
  expect("--trust sts.pem missing.xml", 7, "file: missing.xml: No such file or directory");
  expect("--trust sts.pem --peer-cert missing.pem envelope.xml", 7,
         "file: Cannot open missing.pem: No such file or directory");
}

} // namespace
} // namespace ToolTest
