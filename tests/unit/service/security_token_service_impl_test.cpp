// SPDX-License-Identifier: Apache-2.0

#include "service/security_token_service_impl.h"

#include "support/counting_token.h"
#include "support/data_file.h"
#include "support/service_stand_ins.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::CountingToken;
using Testing::NegotiationHandlerStandIn;
using Testing::ServiceOn;
using Testing::SpecFor;
using Testing::TransportStandIn;
using TokenPtr = std::shared_ptr<const SamlToken>;

std::string TokenXml(const std::string &name) {
  return Testing::ReadDataFile("tokens/" + name + ".xml");
}

/// An operation that returns a token, its request, and how its response begins.
struct TokenOperation {
  const char *name;
  const char *request;
  const char *responseBegin;
  std::function<TokenPtr(const SecurityTokenService &)> run;
};

void PrintTo(const TokenOperation &operation, std::ostream *out) {
  *out << operation.name;
}

std::vector<TokenOperation> TokenOperations() {
  return {
      {"AcquireToken", "1: UserPass alice pass 60", "issued:",
       [](const SecurityTokenService &service) { return service.AcquireToken("alice", "pass", SpecFor(60)); }},
      {"AcquireTokenByGSS", "1: InitialSPNego 60 hello", "leg:context||",
       [](const SecurityTokenService &service) {
         NegotiationHandlerStandIn handler({Testing::Leg("hello")});
         return service.AcquireTokenByGSS(SpecFor(60), handler);
       }},
      {"AcquireTokenByCertificate", "1: Certificate 60",
       "issued:", [](const SecurityTokenService &service) { return service.AcquireTokenByCertificate(SpecFor(60)); }},
      {"AcquireTokenByToken", "1: Exchange 60", "issued:",
       [](const SecurityTokenService &service) { return service.AcquireTokenByToken(CountingToken(), SpecFor(60)); }},
      {"RenewToken", "1: Renew 60",
       "renewed:", [](const SecurityTokenService &service) { return service.RenewToken(CountingToken(), 60); }},
  };
}

/// A service that answers every request with `response`.
struct AnsweringService {
  explicit AnsweringService(const std::string &response)
      : transport(std::make_shared<TransportStandIn>([response](const Request &) { return response; })),
        service(ServiceOn(transport)) {}

  std::shared_ptr<TransportStandIn> transport;
  std::shared_ptr<SecurityTokenServiceImpl> service;
};

class EachTokenOperation : public testing::TestWithParam<TokenOperation> {};

TEST_P(EachTokenOperation, SendsItsRequestInANewSessionAndReturnsTheVerifiedToken) {
  const AnsweringService answering(GetParam().responseBegin + TokenXml("bearer"));
  const TokenPtr token = GetParam().run(*answering.service);
  ASSERT_NE(token, nullptr);
  EXPECT_EQ(token->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  EXPECT_EQ(token->ToXml(), TokenXml("bearer"));
  EXPECT_EQ(answering.transport->Sent(), std::vector<std::string>{GetParam().request});
  EXPECT_EQ(answering.transport->CountSessions(), 1);
  EXPECT_EQ(answering.transport->CountOpenSessions(), 0);
}

TEST_P(EachTokenOperation, ReportsAMalformedTokenAsSsoExceptionWithTheParsersMessage) {
  const AnsweringService answering(std::string(GetParam().responseBegin) + "<other/>");
  EXPECT_THROWS_MESSAGE(GetParam().run(*answering.service), SsoException, "Expected element 'Assertion' not found.");
}

TEST_P(EachTokenOperation, ReportsAnExpiredTokenAsSsoException) {
  const AnsweringService answering(GetParam().responseBegin + TokenXml("expired"));
  EXPECT_THROWS_MESSAGE(GetParam().run(*answering.service), SsoException,
                        "The token has expired at: 2021-01-01T00:00:00.000Z");
}

TEST_P(EachTokenOperation, PassesOnTheExceptionOfAWrongSignature) {
  const AnsweringService answering(GetParam().responseBegin + TokenXml("signed-by-other"));
  EXPECT_THROWS_MESSAGE(GetParam().run(*answering.service), InvalidSignatureException,
                        "Failed to verify signature: token might have been tampered with.");
}

TEST_P(EachTokenOperation, PassesOnTheExceptionOfTextThatIsNotXml) {
  const AnsweringService answering(std::string(GetParam().responseBegin) + "no XML");
  EXPECT_THROWS_MESSAGE(GetParam().run(*answering.service), Tarvel::Xml::XMLParseException,
                        "text comes before the document element at line 1, column 1");
}

TEST_P(EachTokenOperation, PassesOnARefusalOfTheService) {
  const AnsweringService answering("fault:Authentication failed");
  EXPECT_THROWS_MESSAGE(GetParam().run(*answering.service), InvalidCredentialsException, "Authentication failed");
  EXPECT_EQ(answering.transport->CountOpenSessions(), 0);
}

TEST_P(EachTokenOperation, PassesOnAFailureOfTheTransport) {
  const auto transport = std::make_shared<TransportStandIn>(
      [](const Request &) -> std::string { throw CommunicationException("Server returned error: 503 Busy"); });
  EXPECT_THROWS_MESSAGE(GetParam().run(*ServiceOn(transport)), CommunicationException,
                        "Server returned error: 503 Busy");
  EXPECT_EQ(transport->CountOpenSessions(), 0);
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenServiceImpl, EachTokenOperation, testing::ValuesIn(TokenOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

class EachTokenOperationButGss : public EachTokenOperation {};

TEST_P(EachTokenOperationButGss, ReturnsNullWhenTheResponseContainsNoToken) {
  const AnsweringService answering(GetParam().responseBegin);
  EXPECT_EQ(GetParam().run(*answering.service), nullptr);
}

TEST_P(EachTokenOperationButGss, ReleasesItsSessionBeforeTheResponseIsRead) {
  const auto transport =
      std::make_shared<TransportStandIn>([](const Request &) { return std::string(GetParam().responseBegin); });
  int openSessions = -1;
  GetParam().run(*ServiceOn(transport, [&] { openSessions = transport->CountOpenSessions(); }));
  EXPECT_EQ(openSessions, 0);
}

std::vector<TokenOperation> TokenOperationsButGss() {
  std::vector<TokenOperation> operations = TokenOperations();
  operations.erase(operations.begin() + 1); // AcquireTokenByGSS, which continues until it has a token
  return operations;
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenServiceImpl, EachTokenOperationButGss, testing::ValuesIn(TokenOperationsButGss()),
                         [](const auto &operation) { return std::string(operation.param.name); });

TEST(ValidateSubject, ReturnsTheVerdictOfTheService) {
  const AnsweringService yes("valid:true");
  EXPECT_TRUE(yes.service->ValidateSubject(CountingToken()));
  EXPECT_EQ(yes.transport->Sent(), std::vector<std::string>{"1: ValidateSubject"});
  EXPECT_EQ(yes.transport->CountOpenSessions(), 0);
  const AnsweringService no("valid:false");
  EXPECT_FALSE(no.service->ValidateSubject(CountingToken()));
}

TEST(ValidateSubject, ReleasesItsSessionBeforeTheResponseIsRead) {
  const auto transport = std::make_shared<TransportStandIn>([](const Request &) { return std::string("valid:true"); });
  int openSessions = -1;
  ServiceOn(transport, [&] { openSessions = transport->CountOpenSessions(); })->ValidateSubject(CountingToken());
  EXPECT_EQ(openSessions, 0);
}

TEST(ValidateSubject, PassesOnARefusalOfTheService) {
  const AnsweringService answering("fault:Authentication failed");
  EXPECT_THROWS_MESSAGE(answering.service->ValidateSubject(CountingToken()), InvalidCredentialsException,
                        "Authentication failed");
}

TEST(SecurityTokenServiceImpl, OpensANewSessionForEachOperation) {
  const AnsweringService answering("issued:");
  answering.service->AcquireTokenByCertificate(SpecFor(1));
  answering.service->AcquireTokenByCertificate(SpecFor(2));
  EXPECT_EQ(answering.transport->Sent(), (std::vector<std::string>{"1: Certificate 1", "2: Certificate 2"}));
}

TEST(SecurityTokenServiceImpl, SharesItsCollaboratorsWithItsCopies) {
  const AnsweringService answering("issued:");
  SecurityTokenServiceImpl(*answering.service).AcquireTokenByCertificate(SpecFor(5));
  EXPECT_EQ(answering.transport->Sent(), std::vector<std::string>{"1: Certificate 5"});
}

TEST(SecurityTokenServiceImpl, RefusesEveryTokenWithoutTrustedCertificates) {
  const auto transport =
      std::make_shared<TransportStandIn>([](const Request &) { return "issued:" + TokenXml("bearer"); });
  const SecurityTokenServiceImpl service(std::make_shared<const Testing::RequestBuilderStandIn>(), transport,
                                         std::make_shared<const Testing::ResponseHandlerStandIn>(), {});
  EXPECT_THROWS_MESSAGE(service.AcquireTokenByCertificate(SpecFor(1)), InvalidSignatureException,
                        "Signature verification error. No trusted key can be used with the signature algorithm "
                        "\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"");
}

} // namespace
} // namespace SsoClient
