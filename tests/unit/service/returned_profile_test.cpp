// SPDX-License-Identifier: Apache-2.0
// A service that verifies tokens in the profile SAML2, with a stand-in for the network.
#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "support/identity.h"
#include "support/service_stand_ins.h"
#include "support/signed_again.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/service_options.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::ReadDataFile;
using Testing::SpecFor;

constexpr const char *ALICE = "{Name: alice@corp.example; Domain:nameid:upn;name-qualifier=https://idp/}";

/// A holder-of-key token whose name has a qualifier, which the profile STRICT does not read.
const std::string &ForeignToken() {
  static const std::string token = [] {
    std::string xml = ReadDataFile("tokens/holder-of-key.xml");
    const std::string name = "NameID Format=";
    return Testing::SignedAgain(
        xml.replace(xml.find(name), name.size(), "NameID NameQualifier=\"https://idp/\" Format="));
  }();
  return token;
}

class ReturnedProfile : public testing::Test {
protected:
  /// A service that answers each request with `response`.
  static std::shared_ptr<SecurityTokenService> ServiceThatAnswers(const std::string &response,
                                                                  TokenProfile profile = TokenProfile::SAML2) {
    ServiceOptions options;
    options.verifyOptions.profile = profile;
    return std::make_shared<SecurityTokenServiceImpl>(
        std::make_shared<const RequestBuilderImpl>(Testing::HolderIdentity()),
        std::make_shared<Testing::TransportStandIn>([response](const Request &) { return response; }),
        std::make_shared<const ResponseHandlerImpl>(), Testing::TrustedCertificates(), options);
  }

  /// A token that an operation has returned.
  static std::shared_ptr<const SamlToken> HeldToken() {
    return ServiceThatAnswers(Testing::IssueResponse(ForeignToken()))->AcquireToken("alice", "pass", SpecFor(60));
  }
};

TEST_F(ReturnedProfile, AcceptsAnIssuedTokenInTheProfileOfTheOptionsOnly) {
  EXPECT_EQ(ALICE, HeldToken()->GetSubject().ToString());
  const auto strict = ServiceThatAnswers(Testing::IssueResponse(ForeignToken()), TokenProfile::STRICT);
  EXPECT_THROW(strict->AcquireToken("alice", "pass", SpecFor(60)), SsoException);
}

TEST_F(ReturnedProfile, RenewsAToken) {
  const auto renewed = ServiceThatAnswers(Testing::RenewResponse(ForeignToken()))->RenewToken(*HeldToken(), 60);
  EXPECT_EQ(ALICE, renewed->GetSubject().ToString());
}

TEST_F(ReturnedProfile, ExchangesAToken) {
  const auto exchanged =
      ServiceThatAnswers(Testing::IssueResponse(ForeignToken()))->AcquireTokenByToken(*HeldToken(), SpecFor(60));
  EXPECT_EQ(ALICE, exchanged->GetSubject().ToString());
}

TEST_F(ReturnedProfile, ValidatesAToken) {
  const std::string valid = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid";
  EXPECT_TRUE(ServiceThatAnswers(Testing::ValidateResponse(valid))->ValidateSubject(*HeldToken()));
}

TEST_F(ReturnedProfile, NegotiatesAToken) {
  const auto encode = [](const std::string &text) { return Tarvel::StringUtil::Base64Encode(Testing::ToBytes(text)); };
  Testing::NegotiationHandlerStandIn handler({Testing::Leg("c1"), Testing::Leg("end")});
  const auto service = ServiceThatAnswers(Testing::FinalLeg("ctx", encode("s1"), ForeignToken()));
  EXPECT_EQ(ALICE, service->AcquireTokenByGSS(SpecFor(60), handler)->GetSubject().ToString());
}

TEST_F(ReturnedProfile, RefusesOptionsThatTheProfileStrictCannotFulfil) {
  ServiceOptions options;
  options.verifyOptions.acceptedRecipients = {"https://here/"};
  const auto make = [&options] {
    return std::make_shared<SecurityTokenServiceImpl>(
        std::make_shared<const RequestBuilderImpl>(Testing::HolderIdentity()),
        std::make_shared<Testing::TransportStandIn>([](const Request &) { return std::string(); }),
        std::make_shared<const ResponseHandlerImpl>(), Testing::TrustedCertificates(), options);
  };
  EXPECT_THROWS_MESSAGE(make(), Tarvel::InvalidArgumentException,
                        "Invalid argument : VerifyOptions::acceptedRecipients needs the profile SAML2");
  options.verifyOptions.profile = TokenProfile::SAML2;
  EXPECT_NO_THROW(make());
}

} // namespace
} // namespace SsoClient
