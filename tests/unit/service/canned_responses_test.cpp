// SPDX-License-Identifier: Apache-2.0
// The service with its real request builder and response handler; only the network is replaced.
#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "support/identity.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::ReadDataFile;
using Testing::SpecFor;

/// Each request gets the next of the given responses.
class ServiceWithCannedResponses : public testing::Test {
protected:
  std::shared_ptr<const SecurityTokenService> ServiceThatAnswers(const std::vector<std::string> &responses) {
    m_transport = std::make_shared<Testing::TransportStandIn>(
        [this, responses, next = std::make_shared<std::size_t>(0)](const Request &request) {
          m_actions.push_back(request.soapAction);
          return responses.at((*next)++);
        });
    return std::make_shared<SecurityTokenServiceImpl>(
        std::make_shared<const RequestBuilderImpl>(Testing::HolderIdentity()), m_transport,
        std::make_shared<const ResponseHandlerImpl>(), Testing::TrustedCertificates());
  }

  std::shared_ptr<const SamlToken> HeldToken() const {
    return CreateSamlToken(ReadDataFile("tokens/holder-of-key.xml"), Testing::TrustedCertificates());
  }

  void ExpectAlicesToken(const std::shared_ptr<const SamlToken> &token) const {
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
    // The token's text is a complete document.
    EXPECT_NE(CreateSamlToken(token->ToXml(), Testing::TrustedCertificates()), nullptr);
  }

  const std::string m_bearer = ReadDataFile("tokens/bearer.xml");
  std::shared_ptr<Testing::TransportStandIn> m_transport;
  std::vector<std::string> m_actions;
};

TEST_F(ServiceWithCannedResponses, AcquiresATokenByPassword) {
  ExpectAlicesToken(
      ServiceThatAnswers({Testing::IssueResponse(m_bearer)})->AcquireToken("alice@corp.example", "pass", SpecFor(60)));
  EXPECT_EQ(m_actions, std::vector<std::string>{Request::ISSUE});
}

TEST_F(ServiceWithCannedResponses, AcquiresATokenByCertificate) {
  ExpectAlicesToken(ServiceThatAnswers({Testing::IssueResponse(m_bearer)})->AcquireTokenByCertificate(SpecFor(60)));
  EXPECT_EQ(m_actions, std::vector<std::string>{Request::ISSUE});
}

TEST_F(ServiceWithCannedResponses, ExchangesAToken) {
  ExpectAlicesToken(
      ServiceThatAnswers({Testing::IssueResponse(m_bearer)})->AcquireTokenByToken(*HeldToken(), SpecFor(60)));
  EXPECT_EQ(m_actions, std::vector<std::string>{Request::ISSUE});
}

TEST_F(ServiceWithCannedResponses, NegotiatesAToken) {
  const auto encode = [](const std::string &text) { return Tarvel::StringUtil::Base64Encode(Testing::ToBytes(text)); };
  const auto service = ServiceThatAnswers(
      {Testing::IntermediateLeg("ctx", encode("s1")), Testing::FinalLeg("ctx", encode("s2"), m_bearer)});
  Testing::NegotiationHandlerStandIn handler({Testing::Leg("c1"), Testing::Leg("c2"), Testing::Leg("end")});
  ExpectAlicesToken(service->AcquireTokenByGSS(SpecFor(60), handler));
  EXPECT_EQ(handler.received, (std::vector<std::string>{"", "s1", "s2"}));
  EXPECT_EQ(m_actions, (std::vector<std::string>{Request::ISSUE, Request::CHALLANGE}));
  EXPECT_EQ(m_transport->CountSessions(), 1);
}

TEST_F(ServiceWithCannedResponses, ValidatesAToken) {
  const std::string status = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/";
  const auto service =
      ServiceThatAnswers({Testing::ValidateResponse(status + "valid"), Testing::ValidateResponse(status + "invalid")});
  EXPECT_TRUE(service->ValidateSubject(*HeldToken()));
  EXPECT_FALSE(service->ValidateSubject(*HeldToken()));
  EXPECT_EQ(m_actions, (std::vector<std::string>{Request::VALIDATE, Request::VALIDATE}));
}

TEST_F(ServiceWithCannedResponses, RenewsAToken) {
  ExpectAlicesToken(ServiceThatAnswers({Testing::RenewResponse(m_bearer)})->RenewToken(*HeldToken(), 60));
  EXPECT_EQ(m_actions, std::vector<std::string>{Request::RENEW});
}

TEST_F(ServiceWithCannedResponses, ReportsAWrongPassword) {
  const auto service = ServiceThatAnswers({Testing::FaultResponse("wst:FailedAuthentication", "Who are you?")});
  EXPECT_THROWS_MESSAGE(service->AcquireToken("alice@corp.example", "pass", SpecFor(60)), InvalidCredentialsException,
                        "Authentication failed: Who are you?");
}

TEST_F(ServiceWithCannedResponses, SendsNothingWhenTheRequestCannotBeBuilt) {
  const auto service = ServiceThatAnswers({});
  EXPECT_THROWS_MESSAGE(service->AcquireToken("alice@corp.example", "pass", SpecFor(0)),
                        Tarvel::InvalidArgumentException, "Invalid argument : Token lifetime must be positive");
  EXPECT_EQ(m_transport->CountSessions(), 0);
}

} // namespace
} // namespace SsoClient
