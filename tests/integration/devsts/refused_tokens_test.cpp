// SPDX-License-Identifier: Apache-2.0
// Exchange, renewal and validation of tokens that are expired, foreign, changed, bound to another key, or of the wrong
// kind.

#include "messages.h"

namespace DevStsTest {
namespace {

constexpr const char *VALID = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid";
constexpr const char *INVALID = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/invalid";

class RefusedTokens : public testing::Test {
protected:
  /// A holder-of-key token for "client", issued with `fault` unless that is empty.
  Testing::TokenStandIn Acquire(const std::string &fault = {}, const SsoClient::TokenSpec &spec = RenewableSpec()) {
    return TokenIn(
        Send(m_service, CertificateRequest(m_service, spec), fault.empty() ? "/sts" : "/sts/fault/" + fault));
  }
  Testing::TokenStandIn AcquireBearer() { return TokenIn(Send(m_service, PasswordRequest())); }

  HttpAnswer Exchange(const SsoClient::SamlToken &token, const std::string &identity = "client",
                      const SsoClient::TokenSpec &spec = PlainSpec()) {
    SsoClient::Request request;
    BuilderFor(m_service, identity).BuildExchangeTokenRequest(token, spec, request);
    return Send(m_service, request);
  }

  HttpAnswer Renew(const SsoClient::SamlToken &token, const std::string &identity = "client") {
    SsoClient::Request request;
    BuilderFor(m_service, identity).BuildRenewRequest(token, 3600, request);
    return Send(m_service, request);
  }

  /// The status that the service reports for the token.
  std::string Validate(const SsoClient::SamlToken &token) {
    SsoClient::Request request;
    BuilderFor(m_service, "").BuildValidateSubjectRequest(token, request);
    return Between(Send(m_service, request).body, "<wst:Code>", "</wst:Code>");
  }

  /// The token with a text replaced after it was signed.
  static Testing::TokenStandIn Changed(const SsoClient::SamlToken &token, const std::string &from,
                                       const std::string &to) {
    return {token.GetId(), Replaced(token.ToXml(), from, to), token.GetConfirmationMethod()};
  }

  Testing::DevSts m_service;
};

TEST_F(RefusedTokens, GenuineTokenIsExchangedRenewedAndValid) {
  const Testing::TokenStandIn token = Acquire();
  EXPECT_TRUE(IsIssued(Exchange(token)));
  EXPECT_TRUE(IsIssued(Renew(token)));
  EXPECT_EQ(Validate(token), VALID);
}

TEST_F(RefusedTokens, ExchangeOfAnExpiredToken) {
  EXPECT_TRUE(IsRefused(Exchange(Acquire("expired-token")), "wsse:InvalidSecurityToken", "the token has expired"));
}

TEST_F(RefusedTokens, ExchangeOfATokenThatIsNotValidYet) {
  EXPECT_TRUE(IsRefused(Exchange(Acquire("early-token")), "wsse:InvalidSecurityToken", "the token is not valid yet"));
}

TEST_F(RefusedTokens, ExchangeOfAForeignToken) {
  EXPECT_TRUE(IsRefused(Exchange(Acquire("wrong-signer")), "wsse:InvalidSecurityToken",
                        "the token is not signed by this service"));
}

TEST_F(RefusedTokens, ExchangeOfAChangedToken) {
  EXPECT_TRUE(IsRefused(Exchange(Acquire("tampered-token")), "wsse:InvalidSecurityToken",
                        "the token is not signed by this service"));
}

TEST_F(RefusedTokens, ExchangeOfAnUnsignedToken) {
  EXPECT_TRUE(IsRefused(Exchange(Acquire("unsigned-token")), "wsse:InvalidSecurityToken", "no ds:Signature"));
}

TEST_F(RefusedTokens, ExchangeByAnotherKeyThanTheTokens) {
  EXPECT_TRUE(IsRefused(Exchange(Acquire(), "other-client"), "wsse:FailedCheck", "the message's signature is wrong"));
}

TEST_F(RefusedTokens, ExchangeOfABearerTokenWhichHasNoKey) {
  EXPECT_TRUE(IsRefused(Exchange(AcquireBearer()), "wsse:SecurityTokenUnavailable",
                        "a bearer token has no key that could have signed the message"));
}

TEST_F(RefusedTokens, ExchangeWithoutSignature) {
  SsoClient::Request request;
  BuilderFor(m_service, "client").BuildExchangeTokenRequest(Acquire(), PlainSpec(), request);
  // The message's signature is the last one; the token keeps its own.
  const std::size_t at = request.body.rfind("<ds:Signature ");
  request.body = request.body.substr(0, at) + Without(request.body.substr(at), "<ds:Signature ", "</ds:Signature>");
  EXPECT_TRUE(IsRefused(Send(m_service, request), "wsse:InvalidSecurity",
                        "the message presents a token or certificate and is not signed"));
}

TEST_F(RefusedTokens, ExchangeWithAReferenceToAnotherTokensKey) {
  SsoClient::Request request;
  BuilderFor(m_service, "client").BuildExchangeTokenRequest(Acquire(), PlainSpec(), request);
  request.body = Replaced(request.body, "#SAMLID\">_", "#SAMLID\">_0");
  EXPECT_TRUE(IsRefused(Send(m_service, request), "wsse:SecurityTokenUnavailable",
                        "the signature's key reference does not refer to a token of the message"));
}

TEST_F(RefusedTokens, DelegationOfATokenThatIsNotDelegable) {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.delegateTo = std::string("bob@corp.example");
  EXPECT_TRUE(IsRefused(Exchange(Acquire({}, PlainSpec()), "client", spec), "wst:RequestFailed",
                        "the presented token may not be delegated"));
}

// The genuine token is also in the message, at a place that the service does not read, and its signature is valid.
TEST_F(RefusedTokens, ExchangeOfATokenWrappedInAForgedOne) {
  const Testing::TokenStandIn genuine = Acquire();
  std::string forged = Replaced(genuine.ToXml(), genuine.GetId(), "_forged");
  forged = Replaced(forged, "client@corp.example", "alice@corp.example");
  forged = Replaced(forged, "<saml:AuthnStatement ",
                    "<saml:Advice>" + genuine.ToXml() + "</saml:Advice><saml:AuthnStatement ");
  EXPECT_TRUE(IsRefused(Exchange(Testing::TokenStandIn("_forged", forged, SsoClient::SamlToken::HOLDER_OF_KEY)),
                        "wsse:InvalidSecurityToken", "the token's signature does not cover the token"));
}

TEST_F(RefusedTokens, RenewalByAnotherKeyThanTheTokens) {
  EXPECT_TRUE(IsRefused(Renew(Acquire(), "other-client"), "wst:FailedAuthentication",
                        "the renewal is not signed by the holder of the token's key"));
}

TEST_F(RefusedTokens, RenewalOfATokenThatIsNotRenewable) {
  EXPECT_TRUE(IsRefused(Renew(Acquire({}, PlainSpec())), "wst:UnableToRenew", "the token is not renewable"));
}

TEST_F(RefusedTokens, RenewalOfAnExpiredToken) {
  EXPECT_TRUE(IsRefused(Renew(Acquire("expired-token")), "wst:UnableToRenew", "the token has expired"));
}

TEST_F(RefusedTokens, RenewalOfAForeignToken) {
  EXPECT_TRUE(
      IsRefused(Renew(Acquire("wrong-signer")), "wst:InvalidSecurityToken", "the token is not signed by this service"));
}

TEST_F(RefusedTokens, RenewalOfAChangedToken) {
  const Testing::TokenStandIn token = Acquire({}, PlainSpec());
  EXPECT_TRUE(IsRefused(Renew(Changed(token, "Count=\"0\" Postdatable", "Count=\"9\" Postdatable")),
                        "wst:InvalidSecurityToken", "the token is not signed by this service"));
}

TEST_F(RefusedTokens, RenewalOfABearerToken) {
  const Testing::TokenStandIn bearer = AcquireBearer();
  const Testing::TokenStandIn posing(bearer.GetId(), bearer.ToXml(), SsoClient::SamlToken::HOLDER_OF_KEY);
  EXPECT_TRUE(IsRefused(Renew(posing), "wst:FailedAuthentication",
                        "the renewal is not signed by the holder of the token's key"));
}

TEST_F(RefusedTokens, RenewalWithoutSignature) {
  SsoClient::Request request;
  BuilderFor(m_service, "client").BuildRenewRequest(Acquire(), 3600, request);
  const std::string text = Without(request.body, "<ds:Signature ", "</ds:Signature>");
  request.body = Without(text, "<wsse:BinarySecurityToken ", "</wsse:BinarySecurityToken>");
  EXPECT_TRUE(IsRefused(Send(m_service, request), "wsse:InvalidSecurity", "a renewal must be signed"));
}

TEST_F(RefusedTokens, EleventhRenewal) {
  Testing::TokenStandIn token = Acquire();
  for (int i = 0; i < 10; ++i) {
    token = TokenIn(Renew(token));
  }
  EXPECT_TRUE(IsRefused(Renew(token), "wst:UnableToRenew", "the token is not renewable"));
}

TEST_F(RefusedTokens, ValidationReportsEachWrongTokenAsInvalid) {
  EXPECT_EQ(Validate(Acquire("expired-token")), INVALID);
  EXPECT_EQ(Validate(Acquire("early-token")), INVALID);
  EXPECT_EQ(Validate(Acquire("wrong-signer")), INVALID);
  EXPECT_EQ(Validate(Acquire("tampered-token")), INVALID);
  EXPECT_EQ(Validate(Acquire("unsigned-token")), INVALID);
  EXPECT_EQ(Validate(Changed(AcquireBearer(), "alice@", "mallory@")), INVALID);
}

} // namespace
} // namespace DevStsTest
