// SPDX-License-Identifier: Apache-2.0
// The service's faults, seen by a client that reads plain bytes.

#include "messages.h"

#include <tarvel/system/date_time.h>

#include <gmock/gmock.h>

#include <chrono>
#include <cstdint>

namespace DevStsTest {
namespace {

using testing::HasSubstr;
using testing::Not;

class Faults : public testing::Test {
protected:
  HttpAnswer Meet(const std::string &fault) { return Send(m_service, PasswordRequest(), "/sts/fault/" + fault); }

  /// What arrives, and whether the connection ended afterwards.
  std::pair<HttpAnswer, bool> MeetToTheEnd(const std::string &fault) {
    TlsClient client(m_service);
    const SsoClient::Request request = PasswordRequest();
    client.Send(PostBytes(request.soapAction, request.body, "/sts/fault/" + fault));
    HttpAnswer answer = client.Receive();
    return {answer, client.IsClosed()};
  }

  Testing::DevSts m_service;
};

/// For how long the token in an answer is valid, in microseconds.
std::int64_t LifetimeIn(const std::string &answer) {
  const auto instant = [&](const std::string &name) {
    return Tarvel::System::DateTime(Between(answer.substr(answer.find("<saml:Conditions ")), " " + name + "=\"", "\""))
        .GetUtcTime();
  };
  return instant("NotOnOrAfter") - instant("NotBefore");
}

TEST_F(Faults, Documents) {
  EXPECT_THAT(Meet("no-token").body, HasSubstr("<wst:RequestedSecurityToken/>"));
  EXPECT_THAT(Meet("wrong-root").body, testing::StartsWith("<wst:RequestSecurityTokenResponseCollection "));
  EXPECT_THAT(Meet("wrong-element").body, HasSubstr("<wst:RequestedProofToken>"));
  EXPECT_THAT(Meet("wrong-wrapper").body, HasSubstr("<soapenv:Body><wst:RequestSecurityTokenResponse "));
  EXPECT_THAT(Meet("garbled-xml").body, testing::EndsWith("</garbled>"));
  EXPECT_THAT(Meet("not-soap").body, testing::StartsWith("<html>"));
  EXPECT_EQ(Meet("empty-body").body, "");
  EXPECT_EQ(Meet("empty-body").status, 200);
}

TEST_F(Faults, DocumentsOfAValidation) {
  SsoClient::Request request;
  const Testing::TokenStandIn token = TokenIn(Send(m_service, PasswordRequest()));
  BuilderFor(m_service, "").BuildValidateSubjectRequest(token, request);
  EXPECT_THAT(Send(m_service, request, "/sts/fault/wrong-status").body, HasSubstr("/status/unknown</wst:Code>"));
  EXPECT_THAT(Send(m_service, request, "/sts/fault/no-token").body, HasSubstr("<wst:Status/>"));
  EXPECT_THAT(Send(m_service, request, "/sts/fault/wrong-element").body, HasSubstr("<wst:State>"));
  EXPECT_THAT(Send(m_service, request, "/sts/fault/wrong-wrapper").body, HasSubstr("ResponseCollection "));
}

TEST_F(Faults, DocumentsOfARenewal) {
  SsoClient::Request request;
  const Testing::TokenStandIn token = TokenIn(Send(m_service, CertificateRequest(m_service, RenewableSpec())));
  BuilderFor(m_service, "client").BuildRenewRequest(token, 3600, request);
  EXPECT_THAT(Send(m_service, request, "/sts/fault/wrong-wrapper").body, HasSubstr("ResponseCollection "));
  EXPECT_THAT(Send(m_service, request, "/sts/fault/no-token").body, HasSubstr("<wst:RequestedSecurityToken/>"));
}

TEST_F(Faults, Tokens) {
  EXPECT_THAT(Meet("tampered-token").body, HasSubstr(">mallory@corp.example</saml:NameID>"));
  EXPECT_THAT(Meet("unsigned-token").body, Not(HasSubstr("<ds:Signature ")));
  EXPECT_THAT(Meet("wrong-audience").body, HasSubstr("<saml:Audience>https://elsewhere.example/</saml:Audience>"));
  EXPECT_EQ(
      TokenIn(Send(m_service, CertificateRequest(m_service), "/sts/fault/bearer-for-hok")).GetConfirmationMethod(),
      SsoClient::SamlToken::BEARER);
}

TEST_F(Faults, TokensThatDoNotHaveWhatWasAskedFor) {
  SsoClient::TokenSpec spec = RenewableSpec();
  spec.delegable = true;
  spec.delegateTo = "bob@corp.example";
  spec.audienceRestriction = {"https://mail.corp.example/"};
  spec.advice = {{"audit", {{"by", {"alice"}}}}};
  SsoClient::Request request;
  BuilderFor(m_service, "").BuildUserPassTokenRequest("alice@corp.example", "wonderland", spec, request);
  const std::string whole = Send(m_service, request).body;
  const std::string plain = Send(m_service, request, "/sts/fault/plain-token").body;
  for (const char *part : {"<del:Delegate ", "<saml:Audience>", "<rsa:RSAAdvice ",
                           "<saml:ProxyRestriction Count=\"10\"", " Count=\"10\" Postdatable="}) {
    EXPECT_THAT(whole, HasSubstr(part));
    EXPECT_THAT(plain, Not(HasSubstr(part)));
  }
  EXPECT_THAT(plain, HasSubstr("<saml:AuthnStatement "));
}

TEST_F(Faults, TokensThatAreValidForHalfTheTime) {
  EXPECT_EQ(LifetimeIn(Meet("short-lived-token").body) * 2, LifetimeIn(Send(m_service, PasswordRequest()).body));
}

TEST_F(Faults, SoapFaults) {
  const std::string reason = "a fault was asked for";
  EXPECT_TRUE(IsRefused(Meet("soap-fault-FailedAuthentication"), "wst:FailedAuthentication", reason));
  EXPECT_TRUE(IsRefused(Meet("soap-fault-InvalidSecurityToken"), "wst:InvalidSecurityToken", reason));
  EXPECT_TRUE(IsRefused(Meet("soap-fault-wsse-InvalidSecurityToken"), "wsse:InvalidSecurityToken", reason));
  EXPECT_TRUE(IsRefused(Meet("soap-fault-Unknown"), "devsts:Unknown", reason));
  EXPECT_THAT(Meet("soap-fault-without-code").body, Not(HasSubstr("faultcode")));
}

TEST_F(Faults, Statuses) {
  EXPECT_EQ(Meet("bad-status").status, 503);
  EXPECT_EQ(Meet("bad-status-404").status, 404);
  EXPECT_EQ(Meet("bad-status-99").body, "No fault of that name.\n");
}

TEST_F(Faults, AnswersThatEndEarly) {
  const std::size_t whole = Meet("drip-1").body.size();
  for (const char *fault : {"truncate", "reset-in-body"}) {
    const auto [answer, closed] = MeetToTheEnd(fault);
    EXPECT_EQ(answer.status, 200) << fault;
    EXPECT_GT(answer.body.size(), 0U) << fault;
    EXPECT_LT(answer.body.size(), whole) << fault;
    EXPECT_TRUE(closed) << fault;
  }
  const auto [header, closedInHeader] = MeetToTheEnd("reset-in-header");
  EXPECT_EQ(header.status, 0);
  EXPECT_THAT(header.head, testing::StartsWith("HTTP/1.1 200 OK\r\n"));
  EXPECT_TRUE(closedInHeader);
  const auto [nothing, closedAtOnce] = MeetToTheEnd("reset");
  EXPECT_EQ(nothing.head, "");
  EXPECT_TRUE(closedAtOnce);
}

TEST_F(Faults, AnswersThatBreakHttp) {
  EXPECT_THAT(Meet("garbage").head, Not(HasSubstr("HTTP/1.1")));
  EXPECT_THAT(Meet("bad-content-length").head, HasSubstr("\r\nContent-Length: many\r\n"));
  EXPECT_GT(Meet("oversize").body.size(), 16U * 1024 * 1024);
}

TEST_F(Faults, AnswersThatAreSlow) {
  for (const char *fault : {"stall-then-answer-1", "drip-1"}) {
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_TRUE(IsIssued(Meet(fault))) << fault;
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(900)) << fault;
  }
}

TEST_F(Faults, DoNotReplaceRefusals) {
  const SsoClient::Request wrong = PasswordRequest("alice@corp.example", "wrong");
  EXPECT_TRUE(IsRefused(Send(m_service, wrong, "/sts/fault/expired-token"), "wst:FailedAuthentication",
                        "unknown user or wrong password"));
  EXPECT_TRUE(IsRefused(Send(m_service, wrong, "/sts/fault/no-token"), "wst:FailedAuthentication",
                        "unknown user or wrong password"));
}

TEST_F(Faults, WithOnceAffectOnlyTheFirstRequest) {
  EXPECT_EQ(Meet("bad-status/once/a").status, 503);
  EXPECT_TRUE(IsIssued(Meet("bad-status/once/a")));
  EXPECT_EQ(Meet("bad-status/once/b").status, 503);
}

TEST(FaultOption, AppliesToEveryRequest) {
  const Testing::DevSts service({"--fault", "not-soap"});
  EXPECT_THAT(Send(service, PasswordRequest()).body, testing::StartsWith("<html>"));
  EXPECT_EQ(Send(service, PasswordRequest(), "/sts/fault/bad-status").status, 503);
}

} // namespace
} // namespace DevStsTest
