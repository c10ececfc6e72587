// SPDX-License-Identifier: Apache-2.0
// What the tool reports if the issued token lacks something that was asked for, and for requests that services are
// known to refuse.

#include "expect_result.h"
#include "service_test.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"
#include "token_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace ToolTest {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

class UnmetRequest : public ServiceTest {
protected:
  std::string EndOf(const std::string &file) const {
    const std::string xml = m_folder.Read(file);
    return AttributeIn(xml.substr(xml.find("Conditions ")), "NotOnOrAfter");
  }
};

constexpr const char *EVERYTHING = "--delegate-to bob@corp.example --renewable --delegable --advice audit:by=alice "
                                   "--audience https://mail.corp.example/ ";

std::string Warning(const std::string &wanted) {
  return "ssoclient: warning: asked for, but not given by the service: " + wanted + "\n";
}

TEST_F(UnmetRequest, IsOneWarningForEachPropertyThatTheTokenDoesNotHave) {
  const Result result = Run("ssoclient acquire " + Service("plain-token") + PASSWORD + EVERYTHING + "--out token.xml");
  EXPECT_EQ(0, result.exitCode);
  EXPECT_THAT(result.out, StartsWith("Verified:        yes\n"));
  EXPECT_EQ(Warning("delegation to bob@corp.example; the token is not delegated") + Warning("a renewable token") +
                Warning("a delegable token") + Warning("the advice audit:by=alice") +
                Warning("restriction to the audience https://mail.corp.example/; the token is not restricted"),
            result.err);
}

TEST_F(UnmetRequest, IsAWarningEvenWhenStandardOutputGetsTheTokenItself) {
  for (const char *options : {"--format xml", "--out -", "--format xml --out token.xml"}) {
    const Result result = Run("ssoclient acquire " + Service("plain-token") + PASSWORD + "--renewable " + options);
    EXPECT_EQ(0, result.exitCode);
    EXPECT_EQ(Warning("a renewable token"), result.err);
  }
}

TEST_F(UnmetRequest, IsListedInJsonAndIsAlsoAWarningThere) {
  const std::string line =
      "ssoclient acquire --format json " + Service("plain-token") + PASSWORD + EVERYTHING + "--lifetime 1h ";
  const Result result = Run(line);
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ(Warning("delegation to bob@corp.example; the token is not delegated") + Warning("a renewable token") +
                Warning("a delegable token") + Warning("the advice audit:by=alice") +
                Warning("restriction to the audience https://mail.corp.example/; the token is not restricted"),
            result.err);
  EXPECT_THAT(result.out, EndsWith("  ],\n  \"unmet\": [\n    \"delegation\",\n    \"renewable\",\n"
                                   "    \"delegable\",\n    \"advice\",\n    \"audience\"\n  ]\n}\n"));
}

TEST_F(UnmetRequest, IsAShorterLifetimeThanWasAskedFor) {
  const std::string line = "ssoclient acquire " + Service("short-lived-token") + PASSWORD;
  const Result text = Run(line + "--out token.xml");
  EXPECT_EQ(0, text.exitCode);
  EXPECT_EQ(Warning("a lifetime of 28800 seconds; the token ends at " + EndOf("token.xml")), text.err);
  const Result json = Run(line + "--lifetime 10m --format json");
  EXPECT_EQ(0, json.exitCode);
  EXPECT_THAT(json.out, EndsWith("\"unmet\": [\n    \"lifetime\"\n  ]\n}\n"));
}

TEST_F(UnmetRequest, IsAnotherAudienceThanWasAskedFor) {
  const Result result = Run("ssoclient acquire " + Service("wrong-audience") + PASSWORD +
                            "--audience https://mail.corp.example/ --audience https://a.corp.example/");
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ(Warning("restriction to the audience https://a.corp.example/, https://mail.corp.example/; the token is for "
                    "https://elsewhere.example/"),
            result.err);
}

TEST_F(UnmetRequest, IsNotReportedForWhatWasNotAskedFor) {
  ExpectResult(Run("ssoclient acquire " + Service("plain-token") + PASSWORD + "--format xml >token.xml"), 0, "", "");
}

TEST_F(UnmetRequest, OfARenewalIsOnlyTheLifetime) {
  Acquire("token.xml", std::string(IDENTITY) + "--renewable --delegable --audience https://mail.corp.example/");
  const std::string renew = "ssoclient renew --format json " + Service("plain-token") + IDENTITY;
  const Result whole = Run(renew + "token.xml");
  EXPECT_EQ(0, whole.exitCode);
  EXPECT_THAT(whole.out, EndsWith("  ],\n  \"unmet\": []\n}\n"));
  const Result shorter =
      Run("ssoclient renew " + Service("short-lived-token") + IDENTITY + "--lifetime 20m --out renewed.xml token.xml");
  EXPECT_EQ(0, shorter.exitCode);
  EXPECT_EQ(Warning("a lifetime of 1200 seconds; the token ends at " + EndOf("renewed.xml")), shorter.err);
}

TEST_F(UnmetRequest, HasNoJsonKeyWhenTheCommandDoesNotAcquireAToken) {
  Acquire("token.xml", PASSWORD);
  for (const char *command : {"verify --trust sts.pem", "inspect"}) {
    const Result result = Run(std::string("ssoclient ") + command + " --format json token.xml");
    EXPECT_EQ(0, result.exitCode);
    EXPECT_THAT(result.out, HasSubstr("\n  \"certificate\": null"));
    EXPECT_THAT(result.out, Not(HasSubstr("\"unmet\"")));
  }
}

TEST_F(UnmetRequest, ShowsNothingThatControlsTheTerminal) {
  const Result result = Run("ssoclient acquire " + Service("plain-token") + PASSWORD + "--audience 'a\xE2\x80\xAE'");
  EXPECT_EQ(Warning("restriction to the audience a\\u202E; the token is not restricted"), result.err);
}

class DoubtfulRequest : public ServiceTest {};

constexpr const char *DELEGATION_WARNING = "ssoclient: warning: with --delegate-to, the request asks for a token that "
                                           "is bound to the identity's key, but does not prove the key; services "
                                           "refuse that\n";
constexpr const char *DELEGATION_HINT =
    "also give --bearer: with --user or --gss, a token for --delegate-to cannot be bound to a key";
constexpr const char *EXCHANGE_WARNING =
    "ssoclient: warning: the token to exchange is a bearer token; services refuse to exchange those\n";
constexpr const char *EXCHANGE_HINT =
    "an exchange needs a holder-of-key token; acquire one with the identity, and without --bearer";

TEST_F(DoubtfulRequest, ForADelegatedTokenWithAnIdentityIsSentWithAWarningAndRefusedWithAHint) {
  const std::string line =
      "ssoclient acquire " + Service() + PASSWORD + IDENTITY + "--delegate-to bob@corp.example --out token.xml ";
  ExpectResult(Run(line), 8, "",
               std::string(DELEGATION_WARNING) +
                   "ssoclient: service fault: Unexpected SOAP fault: wst:InvalidRequest; request failed.\n"
                   "ssoclient: hint: " +
                   DELEGATION_HINT + "\n");
  EXPECT_THAT(m_service.GetLog(), HasSubstr("the request asks for a holder-of-key token without proof of a key"));
  ExpectResult(Run(line + "--format json"), 8, "",
               R"({"schema":1,"error":{"class":"SsoException","message":)"
               R"("Unexpected SOAP fault: wst:InvalidRequest; request failed.","hint":")" +
                   std::string(DELEGATION_HINT) + "\"}}\n");
  EXPECT_EQ(0u, m_folder.Names().count("token.xml"));
  const Result bearer = Run(line + "--bearer");
  EXPECT_EQ(0, bearer.exitCode);
  EXPECT_EQ("", bearer.err);
  EXPECT_THAT(bearer.out, HasSubstr("\nDelegate:        bob@corp.example at "));
}

TEST_F(DoubtfulRequest, IsNotOneThatContainsTheCertificateBecauseSomeServicesGrantIt) {
  ExpectResult(Run("ssoclient acquire " + Service() + PASSWORD + IDENTITY +
                   "--delegate-to bob@corp.example --dialect-switch use-key=certificate"),
               8, "", "ssoclient: service fault: Unexpected SOAP fault: wst:InvalidRequest; request failed.\n");
  EXPECT_THAT(m_service.GetLog(), HasSubstr("the request asks for a holder-of-key token without proof of a key"));
}

TEST_F(DoubtfulRequest, ToExchangeABearerTokenIsSentWithAWarningAndRefusedWithAHint) {
  Acquire("bearer.xml", std::string(PASSWORD) + "--delegable");
  const std::string line = "ssoclient acquire " + Service() + IDENTITY + "--token bearer.xml ";
  ExpectResult(Run(line), 8, "",
               std::string(EXCHANGE_WARNING) +
                   "ssoclient: service fault: Unexpected SOAP fault: wsse:SecurityTokenUnavailable; request failed.\n"
                   "ssoclient: hint: " +
                   EXCHANGE_HINT + "\n");
  ExpectResult(Run(line + "--format json"), 8, "",
               R"({"schema":1,"error":{"class":"SsoException","message":)"
               R"("Unexpected SOAP fault: wsse:SecurityTokenUnavailable; request failed.","hint":")" +
                   std::string(EXCHANGE_HINT) + "\"}}\n");
}

TEST_F(DoubtfulRequest, ThatIsRefusedForWrongCredentialsHasAHint) {
  ExpectResult(Run("ssoclient acquire " + Service("soap-fault-FailedAuthentication") + PASSWORD + IDENTITY +
                   "--bearer --delegate-to bob@corp.example"),
               3, "", "ssoclient: credentials refused: Authentication failed: a fault was asked for\n");
  Acquire("bearer.xml", PASSWORD);
  const Testing::PostingServer server({Testing::FaultResponse("wst:FailedAuthentication", "no")});
  ExpectResult(Run(std::string("ssoclient acquire --trust sts.pem --allow-http --token bearer.xml ") + IDENTITY +
                   "--sts " + server.GetUrl()),
               3, "",
               std::string(EXCHANGE_WARNING) +
                   "ssoclient: credentials refused: Authentication failed: no\nssoclient: hint: " + EXCHANGE_HINT +
                   "\n");
}

TEST_F(DoubtfulRequest, HasNoHintWhenItFailsForAnotherReason) {
  const std::string more = std::string(PASSWORD) + IDENTITY + "--delegate-to bob@corp.example";
  ExpectResult(Run("ssoclient acquire " + Service("bad-status-404") + more), 4, "",
               std::string(DELEGATION_WARNING) +
                   "ssoclient: communication failed: Server returned error: 404 Not Found\n");
}

TEST_F(DoubtfulRequest, IsNotARequestThatTheServiceGrants) {
  Acquire("client.xml", std::string(IDENTITY) + "--delegable");
  const std::string delegate = "--delegate-to bob@corp.example --format xml >token.xml";
  ExpectResult(Run("ssoclient acquire " + Service() + PASSWORD + delegate), 0, "", "");
  ExpectResult(Run("ssoclient acquire " + Service() + IDENTITY + delegate), 0, "", "");
  ExpectResult(Run("ssoclient acquire " + Service() + IDENTITY + "--token client.xml " + delegate), 0, "", "");
  ExpectResult(Run("ssoclient acquire " + Service() + PASSWORD + IDENTITY + "--format xml >token.xml"), 0, "", "");
}

TEST_F(DoubtfulRequest, IsNotEveryRequestThatTheServiceRefuses) {
  ExpectResult(Run("ssoclient acquire " + Service("soap-fault-InvalidRequest") + PASSWORD), 8, "",
               "ssoclient: service fault: Unexpected SOAP fault: wst:InvalidRequest; request failed.\n");
}

} // namespace
} // namespace ToolTest
