// SPDX-License-Identifier: Apache-2.0
// With -v, each command that calls the service shows what it sends and receives, and no secret.

#include "closed_port.h"
#include "process.h"
#include "service_test.h"
#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace ToolTest {
namespace {

using testing::ContainsRegex;
using testing::HasSubstr;
using testing::Not;

constexpr const char *CANARY = "c4nary-in-the-mine";

class Events : public ServiceTest {
protected:
  Events() { m_folder.Write("canary.txt", std::string(CANARY) + "\n"); }
};

TEST_F(Events, ShowTheStatusAndTheFaultOfARefusal) {
  const Result result =
      Run("ssoclient acquire -v " + Service() + "--user alice@corp.example --password-file wrong.txt");
  EXPECT_EQ(3, result.exitCode);
  EXPECT_THAT(result.err, ContainsRegex("\nssoclient: response: 500 Internal Server Error, text/xml; charset=utf-8, "
                                        "[0-9]+ octets, [0-9]+ ms\n"));
  EXPECT_THAT(result.err,
              ContainsRegex("\nssoclient: fault: [{]http://docs[.]oasis-open[.]org/ws-sx/ws-trust/200512/?[}]"
                            "FailedAuthentication [(]wst:FailedAuthentication[)]: unknown user or wrong "
                            "password\n"));
  EXPECT_THAT(result.err, ContainsRegex("\nssoclient: ended: failed InvalidCredentialsException after [0-9]+ ms\n"));
}

TEST_F(Events, ShowWhyThereIsNoResponse) {
  const ClosedPort port;
  const Result result =
      Run("ssoclient acquire -v --trust sts.pem --ca ca.pem --sts https://" + port.HostAndPort() + " " + PASSWORD);
  EXPECT_EQ(4, result.exitCode);
  EXPECT_THAT(result.err, ContainsRegex("\nssoclient: response: none, Cannot connect to " + port.HostAndPort() +
                                        ": Connection refused, [0-9]+ ms\n"));
  EXPECT_THAT(result.err, ContainsRegex("\nssoclient: ended: failed CommunicationException after [0-9]+ ms\n"));
}

TEST_F(Events, AreShownForEachCommandThatCallsTheService) {
  Acquire("token.xml", std::string(IDENTITY) + "--renewable");
  const auto run = [&](const std::string &command) {
    return Run("ssoclient " + command + " -v " + Service() + "token.xml").err;
  };
  EXPECT_THAT(run(std::string("renew ") + IDENTITY), HasSubstr("ssoclient: started RenewToken "));
  EXPECT_THAT(run("validate"), HasSubstr("ssoclient: started ValidateSubject "));
}

TEST_F(Events, AreNotShownWithoutTheOption) {
  EXPECT_EQ("", Run("ssoclient acquire " + Service() + PASSWORD + "--format xml").err);
}

TEST_F(Events, MaskAPasswordThatTheServiceEchoes) {
  const Testing::PostingServer server(
      {Testing::FaultResponse("wst:InvalidRequest", "no user has " + std::string(CANARY) + " for a password")});
  const Result result =
      Run("ssoclient acquire -v --trust sts.pem --allow-http --user alice --password-file canary.txt --sts " +
          server.GetUrl());
  EXPECT_EQ(8, result.exitCode);
  EXPECT_THAT(result.err, HasSubstr("InvalidRequest (wst:InvalidRequest): no user has *** for a password\n"));
  EXPECT_THAT(result.err, Not(HasSubstr(CANARY)));
}

TEST_F(Events, ShowNothingThatControlsTheTerminal) {
  const Testing::PostingServer server(
      {Testing::FaultResponse("wst:InvalidRequest", "a&#x9B;2J&#10;ssoclient: ended\xE2\x80\xAE")});
  const Result result =
      Run("ssoclient acquire -v --trust sts.pem --allow-http --user alice --password-file canary.txt --sts " +
          server.GetUrl());
  for (const char *control : {"\xC2\x9B", "\xE2\x80\xAE", "\nssoclient: ended\xE2"}) {
    EXPECT_THAT(result.err, Not(HasSubstr(control)));
  }
  EXPECT_THAT(result.err, HasSubstr("a\\u009B2J\\u000Assoclient: ended\\u202E\n"));
}

class Canary : public Events, public testing::WithParamInterface<const char *> {};

TEST_P(Canary, IsNotShownInAFailure) {
  for (const char *format : {"text", "json"}) {
    const Result result = Run("ssoclient acquire -v --format " + std::string(format) + " " + Service(GetParam()) +
                              "--user alice@corp.example --password-file canary.txt");
    EXPECT_NE(0, result.exitCode);
    EXPECT_EQ("", result.out);
    EXPECT_THAT(result.err, HasSubstr("ssoclient: ended: failed "));
    EXPECT_THAT(result.err, Not(HasSubstr(CANARY)));
    EXPECT_THAT(result.err, Not(HasSubstr("SignatureValue")));
  }
}

INSTANTIATE_TEST_SUITE_P(Of, Canary,
                         testing::Values("", "reset", "reset-in-header", "reset-in-body", "truncate", "bad-status",
                                         "garbage", "garbled-xml", "not-soap", "empty-body", "doctype",
                                         "soap-fault-FailedAuthentication", "soap-fault-without-text",
                                         "soap-fault-without-code", "soap-fault-Unknown"),
                         [](const auto &fault) {
                           std::string name = fault.param;
                           std::erase(name, '-');
                           return name.empty() ? "WrongPassword" : name;
                         });

} // namespace
} // namespace ToolTest
