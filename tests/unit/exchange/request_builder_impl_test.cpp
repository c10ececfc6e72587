// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder_impl.h"

#include "support/identity.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <tarvel/core/exception.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <limits>

namespace SsoClient {
namespace {

using namespace Testing;

const char LIFETIME_MESSAGE[] = "Invalid argument : Token lifetime must be positive";
const std::vector<std::uint8_t> LEG = {0x60, 0x82, 0x01};

TokenSpec Spec(std::int64_t lifetimeSec = 600) {
  TokenSpec spec;
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

TokenSpec BearerSpec() {
  TokenSpec spec = Spec();
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  return spec;
}

TokenSpec DelegatedSpec() {
  TokenSpec spec = Spec();
  spec.delegateTo = std::string("bob");
  return spec;
}

const std::string TOKEN_XML = "<a:Assertion xmlns:a=\"urn:a\" ID=\"_1\"></a:Assertion>";
const TokenStandIn HOK_TOKEN("_1", TOKEN_XML, SamlToken::HOLDER_OF_KEY);
const TokenStandIn BEARER_TOKEN("_1", TOKEN_XML, SamlToken::BEARER);
const TokenStandIn UNPARSABLE_BEARER_TOKEN("_1", "<not xml", SamlToken::BEARER);

class RequestBuilderImplTest : public testing::Test {
protected:
  static bool Has(const Request &request, const std::string &text) {
    return request.body.find(text) != std::string::npos;
  }
  static bool IsSigned(const Request &request) { return Has(request, "<ds:Signature "); }
  static bool IsSignedWithCertificate(const Request &request) {
    return IsSigned(request) && Has(request, "<wsse:Reference URI=\"#holderOfKeyCertificate\"") &&
           Has(request, "wsu:Id=\"holderOfKeyCertificate\"");
  }
  static bool AsksForHolderOfKey(const Request &request) {
    return Has(request, "/PublicKey</wst:KeyType>") && Has(request, "<wst:UseKey Sig=\"holderOfKeyProofSignature\">");
  }
  static bool AsksForBearer(const Request &request) {
    return Has(request, "/Bearer</wst:KeyType>") && !Has(request, "wst:UseKey");
  }

  const RequestBuilderImpl m_plain{boost::none};
  const RequestBuilderImpl m_withIdentity{HolderIdentity()};
  Request m_request;
};

TEST(ValidateLifetime, RefusesZeroAndNegativeLifetimesAndAcceptsOne) {
  EXPECT_THROWS_MESSAGE(ValidateLifetime(0), Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(ValidateLifetime(-1), Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(ValidateLifetime(std::numeric_limits<std::int64_t>::min()), Tarvel::InvalidArgumentException,
                        LIFETIME_MESSAGE);
  EXPECT_NO_THROW(ValidateLifetime(1));
}

TEST(RequestBuilderImplCreation, RefusesAnIdentityWithoutKeyOrCertificate) {
  HolderOfKeyConfig withoutKey = HolderIdentity();
  withoutKey.privateKey = nullptr;
  HolderOfKeyConfig withoutCertificate = HolderIdentity();
  withoutCertificate.certificate = nullptr;
  for (const HolderOfKeyConfig &identity : {withoutKey, withoutCertificate, HolderOfKeyConfig()}) {
    EXPECT_THROWS_MESSAGE(RequestBuilderImpl{identity}, Tarvel::InvalidArgumentException,
                          "Invalid argument : HolderOfKeyConfig lacks its private key or its certificate");
  }
}

TEST(ConfOverrideWithDelegate, IsNoneForADelegatedTokenAndOtherwiseThatOfTheSpec) {
  EXPECT_EQ(ConfOverrideWithDelegate(DelegatedSpec()), TokenSpec::CONFIRMATION_NONE);
  EXPECT_EQ(ConfOverrideWithDelegate(Spec()), TokenSpec::CONFIRMATION_DEFAULT);
  EXPECT_EQ(ConfOverrideWithDelegate(BearerSpec()), TokenSpec::CONFIRMATION_NONE);
}

TEST_F(RequestBuilderImplTest, EffectiveConfirmationIsHolderOfKeyOnlyWithAnIdentityAndTheDefault) {
  EXPECT_EQ(m_withIdentity.GetEffectiveConfirmationType(TokenSpec::CONFIRMATION_DEFAULT), SamlToken::HOLDER_OF_KEY);
  EXPECT_EQ(m_withIdentity.GetEffectiveConfirmationType(TokenSpec::CONFIRMATION_NONE), SamlToken::BEARER);
  EXPECT_EQ(m_withIdentity.GetEffectiveConfirmationType(static_cast<TokenSpec::Confirmation>(7)), SamlToken::BEARER);
  EXPECT_EQ(m_plain.GetEffectiveConfirmationType(TokenSpec::CONFIRMATION_DEFAULT), SamlToken::BEARER);
  EXPECT_EQ(m_plain.GetEffectiveConfirmationType(TokenSpec::CONFIRMATION_NONE), SamlToken::BEARER);
}

TEST_F(RequestBuilderImplTest, EveryOperationWithALifetimeRefusesOneThatIsNotPositive) {
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildUserPassTokenRequest("u", "p", Spec(0), m_request),
                        Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildInitialSPNegoRequest(Spec(-1), LEG, m_request),
                        Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildCertificateTokenRequest(Spec(0), m_request),
                        Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildExchangeTokenRequest(HOK_TOKEN, Spec(0), m_request),
                        Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildRenewRequest(HOK_TOKEN, 0, m_request), Tarvel::InvalidArgumentException,
                        LIFETIME_MESSAGE);
  EXPECT_EQ(m_request.soapAction, "");
  EXPECT_EQ(m_request.body, "");
}

TEST_F(RequestBuilderImplTest, ALifetimeOfOneSecondIsAccepted) {
  EXPECT_NO_THROW(m_plain.BuildUserPassTokenRequest("u", "p", Spec(1), m_request));
}

TEST_F(RequestBuilderImplTest, WithoutIdentityRequestsAreNotSignedAndAskForBearerTokens) {
  m_plain.BuildUserPassTokenRequest("u", "p", Spec(), m_request);
  EXPECT_TRUE(AsksForBearer(m_request) && !IsSigned(m_request)) << m_request.body;
  EXPECT_EQ(m_request.soapAction, Request::ISSUE);
  m_plain.BuildInitialSPNegoRequest(Spec(), LEG, m_request);
  EXPECT_TRUE(AsksForBearer(m_request) && !IsSigned(m_request)) << m_request.body;
  EXPECT_EQ(m_request.soapAction, Request::ISSUE);
  m_plain.BuildValidateSubjectRequest(BEARER_TOKEN, m_request);
  EXPECT_FALSE(IsSigned(m_request)) << m_request.body;
  EXPECT_EQ(m_request.soapAction, Request::VALIDATE);
}

TEST_F(RequestBuilderImplTest, WithoutIdentityCertificateExchangeAndRenewFail) {
  EXPECT_THROWS_MESSAGE(m_plain.BuildCertificateTokenRequest(Spec(), m_request), Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
  EXPECT_THROWS_MESSAGE(m_plain.BuildExchangeTokenRequest(HOK_TOKEN, Spec(), m_request), Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to acquire token by token");
  EXPECT_THROWS_MESSAGE(m_plain.BuildRenewRequest(HOK_TOKEN, 600, m_request), Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to renew token");
}

TEST_F(RequestBuilderImplTest, ABadLifetimeIsReportedBeforeAMissingIdentity) {
  EXPECT_THROWS_MESSAGE(m_plain.BuildCertificateTokenRequest(Spec(0), m_request), Tarvel::InvalidArgumentException,
                        LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_plain.BuildExchangeTokenRequest(HOK_TOKEN, Spec(0), m_request),
                        Tarvel::InvalidArgumentException, LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_plain.BuildRenewRequest(BEARER_TOKEN, 0, m_request), Tarvel::InvalidArgumentException,
                        LIFETIME_MESSAGE);
}

TEST_F(RequestBuilderImplTest, ABadLifetimeIsReportedBeforeABadConfirmationOrToken) {
  TokenSpec spec = BearerSpec();
  spec.tokenLifetimeSec = 0;
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildCertificateTokenRequest(spec, m_request), Tarvel::InvalidArgumentException,
                        LIFETIME_MESSAGE);
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildRenewRequest(BEARER_TOKEN, 0, m_request), Tarvel::InvalidArgumentException,
                        LIFETIME_MESSAGE);
}

TEST_F(RequestBuilderImplTest, WithIdentityAUserNameRequestIsSignedAndAsksForHolderOfKey) {
  m_withIdentity.BuildUserPassTokenRequest("u", "p", Spec(), m_request);
  EXPECT_TRUE(IsSignedWithCertificate(m_request) && AsksForHolderOfKey(m_request)) << m_request.body;
}

TEST_F(RequestBuilderImplTest, WithIdentityABearerUserNameRequestIsNotSigned) {
  m_withIdentity.BuildUserPassTokenRequest("u", "p", BearerSpec(), m_request);
  EXPECT_TRUE(AsksForBearer(m_request) && !IsSigned(m_request)) << m_request.body;
}

TEST_F(RequestBuilderImplTest, WithIdentityABearerInitialSPNegoRequestIsNotSigned) {
  for (const int confirmation : {1, 7}) {
    TokenSpec spec = Spec();
    spec.confirmation = static_cast<TokenSpec::Confirmation>(confirmation);
    m_withIdentity.BuildInitialSPNegoRequest(spec, LEG, m_request);
    EXPECT_TRUE(AsksForBearer(m_request)) << m_request.body;
    EXPECT_FALSE(IsSigned(m_request)) << m_request.body;
  }
}

TEST_F(RequestBuilderImplTest, WithIdentityADelegatedRequestAsksForHolderOfKeyButIsNotSigned) {
  m_withIdentity.BuildUserPassTokenRequest("u", "p", DelegatedSpec(), m_request);
  EXPECT_TRUE(AsksForHolderOfKey(m_request) && !IsSigned(m_request)) << m_request.body;
  m_withIdentity.BuildInitialSPNegoRequest(DelegatedSpec(), LEG, m_request);
  EXPECT_TRUE(AsksForHolderOfKey(m_request) && !IsSigned(m_request)) << m_request.body;
}

TEST_F(RequestBuilderImplTest, WithIdentityAnInitialSPNegoRequestIsSigned) {
  m_withIdentity.BuildInitialSPNegoRequest(Spec(), LEG, m_request);
  EXPECT_TRUE(IsSignedWithCertificate(m_request) && AsksForHolderOfKey(m_request)) << m_request.body;
}

TEST_F(RequestBuilderImplTest, AContinuedSPNegoLegIsAChallengeAndNeverSigned) {
  m_withIdentity.BuildContinuedSPNegoRequest("ctx", LEG, m_request);
  EXPECT_EQ(m_request.soapAction, Request::CHALLANGE);
  EXPECT_FALSE(IsSigned(m_request));
  EXPECT_TRUE(Has(m_request, "<wst:RequestSecurityTokenResponse Context=\"ctx\">")) << m_request.body;
}

TEST_F(RequestBuilderImplTest, ACertificateRequestIsSignedAndHasNoOtherToken) {
  m_withIdentity.BuildCertificateTokenRequest(Spec(), m_request);
  EXPECT_EQ(m_request.soapAction, Request::ISSUE);
  EXPECT_TRUE(IsSignedWithCertificate(m_request) && AsksForHolderOfKey(m_request)) << m_request.body;
  EXPECT_TRUE(Has(m_request, "</wsu:Timestamp><wsse:BinarySecurityToken ")) << m_request.body;
}

TEST_F(RequestBuilderImplTest, ADelegatedCertificateRequestIsSigned) {
  m_withIdentity.BuildCertificateTokenRequest(DelegatedSpec(), m_request);
  EXPECT_TRUE(IsSignedWithCertificate(m_request) && AsksForHolderOfKey(m_request)) << m_request.body;
}

TEST_F(RequestBuilderImplTest, ACertificateRequestRefusesAnotherConfirmation) {
  for (const int confirmation : {1, 2, -1}) {
    TokenSpec spec = Spec();
    spec.confirmation = static_cast<TokenSpec::Confirmation>(confirmation);
    EXPECT_THROWS_MESSAGE(
        m_withIdentity.BuildCertificateTokenRequest(spec, m_request), Tarvel::InvalidArgumentException,
        "Invalid argument : TokenSpec::confirmation must be CONFIRMATION_DEFAULT for acquire token by certificate");
  }
  EXPECT_THROWS_MESSAGE(m_plain.BuildCertificateTokenRequest(BearerSpec(), m_request), Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
}

TEST_F(RequestBuilderImplTest, TheSignatureOfAnExchangeRefersToThePresentedToken) {
  for (const TokenSpec &spec : {Spec(), BearerSpec(), DelegatedSpec()}) {
    m_withIdentity.BuildExchangeTokenRequest(BEARER_TOKEN, spec, m_request);
    EXPECT_EQ(m_request.soapAction, Request::ISSUE);
    EXPECT_TRUE(Has(m_request, "</wsu:Timestamp>" + TOKEN_XML + "<ds:Signature ")) << m_request.body;
    EXPECT_TRUE(Has(m_request, ">_1</wsse:KeyIdentifier>")) << m_request.body;
    EXPECT_FALSE(Has(m_request, "wst:UseKey") || Has(m_request, "BinarySecurityToken")) << m_request.body;
  }
}

TEST_F(RequestBuilderImplTest, ARenewRequestIsSignedWithTheCertificate) {
  m_withIdentity.BuildRenewRequest(HOK_TOKEN, 1, m_request);
  EXPECT_EQ(m_request.soapAction, Request::RENEW);
  EXPECT_TRUE(IsSignedWithCertificate(m_request)) << m_request.body;
  EXPECT_TRUE(Has(m_request, "<wst:RenewTarget>" + TOKEN_XML + "</wst:RenewTarget>")) << m_request.body;
}

TEST_F(RequestBuilderImplTest, RenewingABearerTokenFailsBeforeAnyXmlIsBuilt) {
  EXPECT_THROWS_MESSAGE(m_withIdentity.BuildRenewRequest(UNPARSABLE_BEARER_TOKEN, 600, m_request),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : Unable to renew token: the provided token must be Holder Of Key");
  EXPECT_EQ(m_request.soapAction, "");
}

TEST_F(RequestBuilderImplTest, RenewingWithoutIdentityReportsTheMissingIdentityBeforeTheToken) {
  EXPECT_THROWS_MESSAGE(m_plain.BuildRenewRequest(BEARER_TOKEN, 600, m_request), Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to renew token");
}

TEST_F(RequestBuilderImplTest, AValidateRequestIsNotSignedEvenWithAnIdentity) {
  m_withIdentity.BuildValidateSubjectRequest(HOK_TOKEN, m_request);
  EXPECT_FALSE(IsSigned(m_request));
  EXPECT_TRUE(Has(m_request, "<wst:ValidateTarget>" + TOKEN_XML + "</wst:ValidateTarget>")) << m_request.body;
}

TEST_F(RequestBuilderImplTest, AFailureWhileComposingDoesNotChangeTheBody) {
  m_request.body = "earlier";
  EXPECT_THROWS_MESSAGE(m_plain.BuildValidateSubjectRequest(UNPARSABLE_BEARER_TOKEN, m_request),
                        Tarvel::Xml::XMLParseException, "the document ends in a start tag at line 1, column 9");
  EXPECT_EQ(m_request.soapAction, Request::VALIDATE);
  EXPECT_EQ(m_request.body, "earlier");
}

TEST_F(RequestBuilderImplTest, SetsTheActionBeforeAndTheBodyAfterItComposesTheEnvelope) {
  // A key that cannot sign is noticed when the envelope is composed.
  const RequestBuilderImpl builder(
      HolderOfKeyConfig{Tarvel::Crypto::CreatePrivateKey(ReadDataFile("tokens/sts-ec256.key")),
                        Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-ec256.crt"))});
  const auto expectOnlyAction = [](const char *action, const auto &build) {
    Request request;
    request.body = "earlier";
    EXPECT_THROW(build(request), Tarvel::Exception);
    EXPECT_EQ(request.soapAction, action);
    EXPECT_EQ(request.body, "earlier");
  };
  expectOnlyAction(Request::ISSUE, [&](Request &out) { builder.BuildUserPassTokenRequest("u", "p", Spec(), out); });
  expectOnlyAction(Request::ISSUE, [&](Request &out) { builder.BuildInitialSPNegoRequest(Spec(), LEG, out); });
  expectOnlyAction(Request::CHALLANGE, [&](Request &out) { builder.BuildContinuedSPNegoRequest("\x01", LEG, out); });
  expectOnlyAction(Request::ISSUE, [&](Request &out) { builder.BuildCertificateTokenRequest(Spec(), out); });
  expectOnlyAction(Request::ISSUE, [&](Request &out) { builder.BuildExchangeTokenRequest(HOK_TOKEN, Spec(), out); });
  expectOnlyAction(Request::VALIDATE,
                   [&](Request &out) { builder.BuildValidateSubjectRequest(UNPARSABLE_BEARER_TOKEN, out); });
  expectOnlyAction(Request::RENEW, [&](Request &out) { builder.BuildRenewRequest(HOK_TOKEN, 600, out); });
}

TEST_F(RequestBuilderImplTest, RefusesATextThatXmlCannotCarryWithoutQuotingThePassword) {
  const std::string password = "s3cret\x01pass";
  try {
    m_plain.BuildUserPassTokenRequest("u", password, Spec(), m_request);
    FAIL() << "accepted";
  } catch (const Tarvel::InvalidArgumentException &refusal) {
    EXPECT_EQ(refusal.Dump().find("s3cret"), std::string::npos) << refusal.Dump();
  }
  EXPECT_EQ(m_request.body, "");
}

TEST_F(RequestBuilderImplTest, ReplacesActionAndBodyOfAnEarlierRequest) {
  m_plain.BuildUserPassTokenRequest("u", "first-password", Spec(), m_request);
  m_plain.BuildValidateSubjectRequest(BEARER_TOKEN, m_request);
  EXPECT_EQ(m_request.soapAction, Request::VALIDATE);
  EXPECT_FALSE(Has(m_request, "first-password"));
}

} // namespace
} // namespace SsoClient
