// SPDX-License-Identifier: Apache-2.0
// Each operation against the development service, over TLS: all facts of the token are compared.
#include "integration/service/service_client.h"
#include "support/identity.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace SsoClient {
namespace {

using namespace Testing;
using TokenPtr = std::shared_ptr<const SamlToken>;

const char FULL_ADVICE[] = "https://advice.example/{colour=red,green;size=7} urn:more{no value=}";

/// `fields` with the values of a token that was requested with `FullSpec`.
ExpectedFields Full(ExpectedFields fields) {
  fields.lifetimeSec = 7200;
  fields.renewable = true;
  fields.delegable = true;
  fields.audience = {"https://a.example/", "https://b.example/"};
  fields.advice = FULL_ADVICE;
  return fields;
}

/// The fields of alice's token, bound to the key of `identity`.
ExpectedFields Held(const std::string &identity) {
  ExpectedFields fields;
  fields.confirmation = identity;
  return fields;
}

TokenSpec Bearer(TokenSpec spec) {
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  return spec;
}

TokenSpec To(const std::string &delegate, TokenSpec spec) {
  spec.delegateTo = delegate;
  return spec;
}

TokenSpec Delegable(TokenSpec spec) {
  spec.delegable = true;
  return spec;
}

class ServiceOverTls : public testing::Test {
protected:
  const std::int64_t m_begin = NowInMilliseconds();
  const ServiceClient m_plain;
  const ServiceClient m_client{"client"};
};

TEST_F(ServiceOverTls, AcquiresABearerTokenByPassword) {
  EXPECT_EQ(Compare(m_plain->AcquireToken(ALICE, PASSWORD, SpecFor(3600)), {}, m_begin), "");
}

TEST_F(ServiceOverTls, AcquiresABearerTokenByPasswordWithEverythingThatASpecCanRequest) {
  EXPECT_EQ(Compare(m_plain->AcquireToken(ALICE, PASSWORD, SpecWithEverything()), Full({}), m_begin), "");
}

TEST_F(ServiceOverTls, AcquiresAHolderOfKeyTokenByPasswordWithEverythingThatASpecCanRequest) {
  EXPECT_EQ(Compare(m_client->AcquireToken(ALICE, PASSWORD, SpecWithEverything()), Full(Held("client")), m_begin), "");
}

TEST_F(ServiceOverTls, AcquiresABearerTokenByPasswordEvenWithAnIdentity) {
  EXPECT_EQ(Compare(m_client->AcquireToken(ALICE, PASSWORD, Bearer(SpecFor(3600))), {}, m_begin), "");
}

TEST_F(ServiceOverTls, AcquiresADelegatedTokenByPassword) {
  ExpectedFields expected;
  expected.delegation = {"bob@corp.example"};
  EXPECT_EQ(Compare(m_client->AcquireToken(ALICE, PASSWORD, To("bob@corp.example", Bearer(SpecFor(3600)))), expected,
                    m_begin),
            "");
}

TEST_F(ServiceOverTls, AcquiresATokenByCertificate) {
  EXPECT_EQ(Compare(m_client->AcquireTokenByCertificate(SpecFor(3600)), FieldsOfCertificate("client"), m_begin), "");
  const ServiceClient other("other-client");
  EXPECT_EQ(Compare(other->AcquireTokenByCertificate(SpecWithEverything()), Full(FieldsOfCertificate("other-client")),
                    m_begin),
            "");
}

TEST_F(ServiceOverTls, AcquiresADelegatedTokenByCertificate) {
  ExpectedFields expected = Full(FieldsOfCertificate("client"));
  expected.delegation = {"bob@corp.example"};
  EXPECT_EQ(
      Compare(m_client->AcquireTokenByCertificate(To("bob@corp.example", SpecWithEverything())), expected, m_begin),
      "");
}

TEST_F(ServiceOverTls, ExchangesATokenWithoutDelegation) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, Delegable(SpecFor(3600)));
  const TokenPtr exchanged = m_client->AcquireTokenByToken(*held, SpecWithEverything());
  EXPECT_EQ(Compare(exchanged, Full(Held("client")), m_begin), "");
  EXPECT_NE(exchanged->GetId(), held->GetId());
}

TEST_F(ServiceOverTls, ExchangesATokenForABearerToken) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecFor(60));
  EXPECT_EQ(Compare(m_client->AcquireTokenByToken(*held, Bearer(SpecFor(3600))), {}, m_begin), "");
}

TEST_F(ServiceOverTls, ExchangesATokenWithDelegationRepeatedly) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, Delegable(SpecFor(3600)));
  const TokenPtr first = m_client->AcquireTokenByToken(*held, To("bob@corp.example", SpecWithEverything()));
  ExpectedFields expected = Full(Held("client"));
  expected.delegation = {"bob@corp.example"};
  EXPECT_EQ(Compare(first, expected, m_begin), "");
  const std::int64_t later = NowInMilliseconds();
  const TokenPtr second = m_client->AcquireTokenByToken(*first, To("carol@corp.example", SpecWithEverything()));
  expected.delegation = {"bob@corp.example", "carol@corp.example"};
  EXPECT_EQ(Compare(second, expected, later), "");
  std::vector<Delegate> before, after;
  first->GetDelegationChain(before);
  second->GetDelegationChain(after);
  EXPECT_EQ(after.at(0).delegationInstant.GetUtcTime(), before.at(0).delegationInstant.GetUtcTime());
}

TEST_F(ServiceOverTls, RenewsAToken) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecWithEverything());
  const TokenPtr renewed = m_client->RenewToken(*held, 1800);
  ExpectedFields expected = Full(Held("client"));
  expected.lifetimeSec = 1800;
  EXPECT_EQ(Compare(renewed, expected, m_begin), "");
  EXPECT_NE(renewed->GetId(), held->GetId());
  EXPECT_GE(renewed->GetStartDate().GetUtcTime(), held->GetStartDate().GetUtcTime());
  EXPECT_EQ(Compare(m_client->RenewToken(*renewed, 1800), expected, m_begin), "");
}

TEST_F(ServiceOverTls, ValidatesATokenOfEitherKind) {
  EXPECT_TRUE(m_plain->ValidateSubject(*m_plain->AcquireToken(ALICE, PASSWORD, SpecFor(60))));
  EXPECT_TRUE(m_plain->ValidateSubject(*m_client->AcquireToken(ALICE, PASSWORD, SpecWithEverything())));
  EXPECT_TRUE(m_client->ValidateSubject(*m_client->AcquireTokenByCertificate(SpecFor(60))));
}

/// The token with a changed first name.
TokenStandIn Tampered(const SamlToken &token) {
  std::string xml = token.ToXml();
  xml.replace(xml.find(">Alice<"), 7, ">Malice<");
  return TokenStandIn(token.GetId(), xml, token.GetConfirmationMethod());
}

TEST_F(ServiceOverTls, ReportsThatATamperedTokenIsNotValid) {
  EXPECT_FALSE(m_plain->ValidateSubject(Tampered(*m_plain->AcquireToken(ALICE, PASSWORD, SpecFor(60)))));
}

TEST_F(ServiceOverTls, ReportsAWrongPasswordAndAnUnknownUserAlike) {
  const char message[] = "Authentication failed: unknown user or wrong password";
  EXPECT_THROWS_MESSAGE(m_plain->AcquireToken(ALICE, "looking-glass", SpecFor(60)), InvalidCredentialsException,
                        message);
  EXPECT_THROWS_MESSAGE(m_plain->AcquireToken("mallory@corp.example", PASSWORD, SpecFor(60)),
                        InvalidCredentialsException, message);
  EXPECT_THROWS_MESSAGE(m_client->AcquireToken(ALICE, "", SpecFor(60)), InvalidCredentialsException, message);
  EXPECT_NE(m_plain->AcquireToken(ALICE, PASSWORD, SpecFor(60)), nullptr);
}

TEST_F(ServiceOverTls, ReportsThatAHolderOfKeyTokenWasRequestedWithoutProof) {
  // With a delegate the request is not signed, but it still requests a token for the identity's key.
  EXPECT_THROWS_MESSAGE(m_client->AcquireToken(ALICE, PASSWORD, To("bob@corp.example", SpecFor(60))), SsoException,
                        "Unexpected SOAP fault: wst:InvalidRequest; request failed.");
}

TEST_F(ServiceOverTls, ReportsARenewalByAnotherKey) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecWithEverything());
  EXPECT_THROWS_MESSAGE(ServiceClient("other-client")->RenewToken(*held, 60), InvalidCredentialsException,
                        "Authentication failed: the renewal is not signed by the holder of the token's key");
}

TEST_F(ServiceOverTls, ReportsAnExchangeByAnotherKey) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecFor(60));
  EXPECT_THROWS_MESSAGE(ServiceClient("other-client")->AcquireTokenByToken(*held, SpecFor(60)), SsoException,
                        "Unexpected SOAP fault: wsse:FailedCheck; request failed.");
}

TEST_F(ServiceOverTls, ReportsACertificateThatTheServiceDoesNotKnow) {
  const auto context = TrustingContext();
  SecurityTokenServiceConfig config = ConfigFor(*context, "", RunningService().GetUrl());
  config.holderOfKeyConfig = HolderIdentity();
  EXPECT_THROWS_MESSAGE(
      CreateSecurityTokenService(config)->AcquireTokenByCertificate(SpecFor(60)), InvalidCredentialsException,
      "Authentication failed: the certificate is not a client certificate of the service's authority");
}

TEST_F(ServiceOverTls, ReportsARenewalOfATokenThatIsNotRenewable) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecFor(60));
  EXPECT_THROWS_MESSAGE(m_client->RenewToken(*held, 60), SsoException,
                        "Unexpected SOAP fault: wst:UnableToRenew; request failed.");
}

TEST_F(ServiceOverTls, ReportsTheDelegationOfATokenThatIsNotDelegable) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecFor(60));
  EXPECT_THROWS_MESSAGE(m_client->AcquireTokenByToken(*held, To("bob@corp.example", SpecFor(60))), SsoException,
                        "Unexpected SOAP fault: wst:RequestFailed; request failed.");
}

TEST_F(ServiceOverTls, ReportsThatATamperedTokenIsNotExchangedOrRenewed) {
  const TokenPtr held = m_client->AcquireToken(ALICE, PASSWORD, SpecWithEverything());
  const char message[] = "Authentication failed: the token is not signed by this service";
  EXPECT_THROWS_MESSAGE(m_client->AcquireTokenByToken(Tampered(*held), SpecFor(60)), InvalidCredentialsException,
                        message);
  EXPECT_THROWS_MESSAGE(m_client->RenewToken(Tampered(*held), 60), InvalidCredentialsException, message);
}

TEST_F(ServiceOverTls, RefusesAMissingLifetimeOrIdentityWithoutARequest) {
  const DevSts service; // the running service can still log what earlier tests sent to it
  const std::string log = service.GetLog();
  const ServiceClient client("", service.GetUrl());
  EXPECT_THROWS_MESSAGE(client->AcquireToken(ALICE, PASSWORD, SpecFor(0)), Tarvel::InvalidArgumentException,
                        "Invalid argument : Token lifetime must be positive");
  EXPECT_THROWS_MESSAGE(client->AcquireTokenByCertificate(SpecFor(60)), Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
  EXPECT_EQ(service.GetLog(), log);
}

TEST_F(ServiceOverTls, RefusesATokenThatIsSignedWithAnUntrustedKey) {
  const auto context = TrustingContext();
  SecurityTokenServiceConfig config = ConfigFor(*context, "", RunningService().GetUrl());
  config.signingCertificates = {
      Tarvel::Crypto::CreateCertificateFromPem(RunningService().ReadStateFile("foreign.crt"))};
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(config)->AcquireToken(ALICE, PASSWORD, SpecFor(60)),
                        InvalidSignatureException, "Failed to verify signature: token might have been tampered with.");
}

TEST_F(ServiceOverTls, TrustsTheServersThumbprintWithoutAnAuthority) {
  const auto context = Tarvel::Ssl::CreateSSLContext();
  SecurityTokenServiceConfig config = ConfigFor(*context, "", RunningService().GetUrl());
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(config)->AcquireToken(ALICE, PASSWORD, SpecFor(60)),
                        CommunicationException,
                        "The TLS handshake with localhost failed: the server's certificate was not accepted: "
                        "unable to get local issuer certificate (certificate \"CN=localhost,O=corp.example\")");
  config.sslParameter = RunningService().GetThumbprint();
  EXPECT_EQ(Compare(CreateSecurityTokenService(config)->AcquireToken(ALICE, PASSWORD, SpecFor(3600)), {}, m_begin), "");
}

} // namespace
} // namespace SsoClient
