// SPDX-License-Identifier: Apache-2.0
// What renew and validate do with tokens, and with the service's answers.

#include "expect_result.h"
#include "refusals.h"
#include "service_test.h"
#include "support/data_file.h"
#include "token_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace ToolTest {
namespace {

using testing::HasSubstr;

constexpr const char *RENEWED_TEXT = R"(Verified:        yes
Id:              @ID@
Subject:         client@corp.example
Confirmation:    holder-of-key
Not before:      @NOT_BEFORE@
Not on or after: @NOT_ON_OR_AFTER@
Renewable:       yes
Delegable:       no
Solution:        yes
Certificate:     CN=client,O=corp.example
                 SHA-256 @SHA256@
)";

class Renew : public ServiceTest {
protected:
  Renew() { Acquire("token.xml", std::string(IDENTITY) + "--renewable --lifetime 10m"); }

  std::string Thumbprint() const {
    return Run("openssl x509 -in client.pem -noout -fingerprint -sha256 | sed 's/.*=//;s/://g' | tr -d '\\n' | "
               "tr A-F a-f")
        .out;
  }
};

TEST_F(Renew, GivesANewTokenAndLeavesTheOldOne) {
  const std::string before = m_folder.Read("token.xml");
  const Result result = Run("ssoclient renew " + Service() + IDENTITY + "--lifetime 1h --out renewed.xml token.xml");
  const std::string renewed = m_folder.Read("renewed.xml");
  ExpectResult({result.exitCode, WithoutDistances(result.out), result.err}, 0,
               Fill(FillFrom(renewed, RENEWED_TEXT), "@SHA256@", Thumbprint()), "");
  EXPECT_NE(AttributeIn(before, "ID"), AttributeIn(renewed, "ID"));
  EXPECT_EQ(before, m_folder.Read("token.xml"));
}

TEST_F(Renew, ReplacesTheOldTokenWithTheNewOne) {
  const std::string before = m_folder.Read("token.xml");
  const Result result = Run("ssoclient renew " + Service() + IDENTITY + "--out token.xml --force - <token.xml");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_NE(AttributeIn(before, "ID"), AttributeIn(m_folder.Read("token.xml"), "ID"));
}

TEST_F(Renew, IsRefusedForAnotherKeyThanTheTokens) {
  ExpectResult(Run("ssoclient renew " + Service() + OTHER_IDENTITY + "token.xml"), 3, "",
               "ssoclient: credentials refused: Authentication failed: the renewal is not signed by the holder of the "
               "token's key\n");
}

TEST_F(Renew, IsRefusedForATokenThatIsNotRenewable) {
  Acquire("fixed.xml", IDENTITY);
  ExpectResult(Run("ssoclient renew --format json " + Service() + IDENTITY + "fixed.xml"), 8, "",
               R"({"schema":1,"error":{"class":"SsoException","message":)"
               R"("Unexpected SOAP fault: wst:UnableToRenew; request failed."}})"
               "\n");
}

TEST_F(Renew, RefusesTheServicesWrongAnswers) {
  const auto run = [&](const char *fault) {
    return Run("ssoclient renew " + Service(fault) + IDENTITY + "--out renewed.xml token.xml");
  };
  ExpectResult(
      run("wrong-signer"), 6, "",
      RefusalText("signature invalid", "Failed to verify signature: token might have been tampered with.", SAVE_HINT));
  ExpectResult(run("wrong-wrapper"), 8, "", "ssoclient: service fault: Unexpected XML format\n");
  ExpectResult(run("bad-status-404"), 4, "", "ssoclient: communication failed: Server returned error: 404 Not Found\n");
  EXPECT_EQ(0u, m_folder.Names().count("renewed.xml"));
}

TEST_F(Renew, ChecksTheNewTokenWithANarrowerTolerance) {
  // The old token is valid for a day. The new one is valid for one second, and the tolerance removes that second.
  Acquire("long.xml", std::string(IDENTITY) + "--renewable --lifetime 1d");
  const Result result =
      Run("ssoclient renew " + Service() + IDENTITY + "--tolerance -1 --lifetime 1s --out renewed.xml long.xml");
  EXPECT_EQ(5, result.exitCode);
  EXPECT_EQ(0u, m_folder.Names().count("renewed.xml"));
}

class Validate : public ServiceTest {
protected:
  Validate() { Acquire("token.xml", PASSWORD); }
};

TEST_F(Validate, SaysThatATokenIsValid) {
  ExpectResult(Run("ssoclient validate " + Service() + "token.xml"), 0, "valid\n", "");
  ExpectResult(Run("ssoclient validate --format json " + Service() + "- <token.xml"), 0,
               "{\"schema\":1,\"valid\":true}\n", "");
}

TEST_F(Validate, SaysThatATokenIsNotValid) {
  // Signed with a key that is trusted here, but not issued by the service.
  const std::string tokens = Testing::DataPath("tokens/");
  const std::string foreign = "--trust " + tokens + "sts-rsa.crt " + tokens + "bearer.xml";
  ExpectResult(Run("ssoclient validate " + Service() + foreign), 5, "invalid\n", "");
  ExpectResult(Run("ssoclient validate --format json " + Service() + foreign), 5, "{\"schema\":1,\"valid\":false}\n",
               "");
}

TEST_F(Validate, AsksAboutATokenThatHasExpiredWhenTheToleranceAllowsIt) {
  const std::string tokens = Testing::DataPath("tokens/");
  ExpectResult(Run("ssoclient validate " + Service() + "--tolerance 3000000000 --trust " + tokens + "sts-rsa.crt " +
                   tokens + "expired.xml"),
               5, "invalid\n", "");
}

TEST_F(Validate, RefusesTheServicesWrongAnswers) {
  const auto run = [&](const char *fault) { return Run("ssoclient validate " + Service(fault) + "token.xml"); };
  ExpectResult(run("wrong-status"), 8, "", "ssoclient: service fault: Unexpected XML format\n");
  ExpectResult(run("soap-fault-FailedAuthentication"), 3, "",
               "ssoclient: credentials refused: Authentication failed: a fault was asked for\n");
  ExpectResult(run("bad-status"), 4, "",
               "ssoclient: communication failed: Server returned error: 503 Service Unavailable\n");
}

TEST_F(Validate, ReportsAnOutputThatCannotBeWritten) {
  ExpectResult(Run("ssoclient validate " + Service() + "token.xml >/dev/full"), 7, "",
               "ssoclient: file: standard output: No space left on device\n");
}

TEST_F(Validate, ReportsAStandardStreamThatIsClosed) {
  ExpectResult(Run("ssoclient validate " + Service() + "token.xml >&-"), 7, "",
               "ssoclient: file: standard output: Bad file descriptor\n");
  ExpectResult(Run("ssoclient validate " + Service() + "- <&-"), 7, "", "ssoclient: file: -: Bad file descriptor\n");
}

TEST_F(Validate, ShowsTheLibrarysLogWithoutATokenInIt) {
  const Result result = Run("ssoclient validate -v " + Service() + "token.xml");
  EXPECT_EQ("valid\n", result.out);
  EXPECT_THAT(result.err, HasSubstr(" START operation TokenClient::ValidateSubject\n"));
  EXPECT_THAT(result.err, HasSubstr("\nssoclient: log: Result: true\n"));
  EXPECT_THAT(result.err, HasSubstr(" END operation TokenClient::ValidateSubject\n"));
  EXPECT_THAT(result.err, testing::Not(HasSubstr("saml:")));
}

} // namespace
} // namespace ToolTest
