// SPDX-License-Identifier: Apache-2.0
// Requests in dialects that services of other makers need: what the development service accepts, and what it refuses.

#include "messages.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/service_options.h>
#include <tarvel/ssl/ssl_context.h>

#include <gmock/gmock.h>

namespace DevStsTest {
namespace {

using SsoClient::PrincipalId;
using SsoClient::SamlToken;
using SsoClient::ServiceDialect;
using SsoClient::TokenSpec;
using testing::HasSubstr;
using testing::Not;

using Token = std::shared_ptr<const SamlToken>;

/// Adds to a request everything that a dialect can add and a WS-Trust 1.3 service understands or ignores.
ServiceDialect FullDialect() {
  ServiceDialect dialect;
  dialect.declaresCharset = true;
  dialect.appliesTo = std::string("https://files.example/");
  dialect.addressing = true;
  dialect.delegatable = ServiceDialect::Statement::WHEN_TRUE;
  dialect.renewing = ServiceDialect::Statement::WHEN_TRUE;
  dialect.useKey = ServiceDialect::UseKey::CERTIFICATE;
  dialect.tokenType = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
  dialect.standardTokenTypeReference = true;
  return dialect;
}

ServiceDialect OnBehalfOf() {
  ServiceDialect dialect;
  dialect.delegation = ServiceDialect::Delegation::ON_BEHALF_OF;
  return dialect;
}

std::string NameOf(const PrincipalId &principal) {
  return principal.name + "@" + principal.domain;
}

class Dialects : public testing::Test {
protected:
  std::shared_ptr<SsoClient::SecurityTokenService> Client(const ServiceDialect &dialect,
                                                          const std::string &identity = {}) {
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = m_service.GetUrl();
    config.signingCertificates = {Tarvel::Crypto::CreateCertificateFromPem(m_service.ReadStateFile("signing.crt"))};
    m_tls->TrustFile(m_service.PathOf("authority.crt"));
    config.sslContext = m_tls.get();
    if (!identity.empty()) {
      config.holderOfKeyConfig = IdentityOf(m_service, identity);
    }
    SsoClient::ServiceOptions options;
    options.dialect = dialect;
    return SsoClient::CreateSecurityTokenService(config, options);
  }

  /// A request by certificate, signed by the identity "client".
  std::string CertificateBody(const ServiceDialect &dialect, const TokenSpec &spec = PlainSpec()) const {
    SsoClient::Request request;
    SsoClient::RequestBuilderImpl(IdentityOf(m_service, "client"), dialect, m_service.GetUrl())
        .BuildCertificateTokenRequest(spec, request);
    return request.body;
  }

  /// A request by alice's password, with `delegate` in the form of the dialect.
  static std::string PasswordBody(const ServiceDialect &dialect, const std::string &delegate) {
    TokenSpec spec = PlainSpec();
    spec.delegateTo = delegate;
    SsoClient::Request request;
    SsoClient::RequestBuilderImpl(boost::none, dialect, "")
        .BuildUserPassTokenRequest("alice@corp.example", "wonderland", spec, request);
    return request.body;
  }

  HttpAnswer Post(const std::string &body) const {
    return DevStsTest::Post(m_service, SsoClient::Request::ISSUE, body);
  }

  Testing::DevSts m_service;
  Tarvel::Ref<Tarvel::Ssl::SSLContext> m_tls = Tarvel::Ssl::CreateSSLContext();
};

TEST_F(Dialects, WithEveryAdditionAreServedInEachOperation) {
  const auto client = Client(FullDialect(), "client");
  const Token token = client->AcquireToken("alice@corp.example", "wonderland", RenewableSpec());
  EXPECT_EQ("alice@corp.example", NameOf(token->GetSubject()));
  EXPECT_EQ(SamlToken::HOLDER_OF_KEY, token->GetConfirmationMethod());
  EXPECT_EQ(IdentityOf(m_service, "client").certificate->GetDer(), token->GetConfirmationCertificate()->GetDer());
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_TRUE(token->IsDelegable());
  EXPECT_EQ("alice@corp.example", NameOf(client->RenewToken(*token, 7200)->GetSubject()));
  EXPECT_TRUE(client->ValidateSubject(*token));
  const Token exchanged = client->AcquireTokenByToken(*token, PlainSpec());
  EXPECT_EQ("alice@corp.example", NameOf(exchanged->GetSubject()));
  EXPECT_FALSE(exchanged->IsRenewable());
  EXPECT_FALSE(exchanged->IsDelegable());
  EXPECT_EQ("client@corp.example", NameOf(client->AcquireTokenByCertificate(PlainSpec())->GetSubject()));
}

TEST_F(Dialects, AreAnsweredWithTheTokenTypeThatWasAskedForAndWithoutHeaders) {
  const HttpAnswer answer = Post(CertificateBody(FullDialect()));
  ASSERT_TRUE(IsIssued(answer));
  EXPECT_EQ("http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0",
            Between(answer.body, "<wst:TokenType>", "<"));
  EXPECT_THAT(answer.body, Not(HasSubstr("Header")));
  SsoClient::Request renewal;
  SsoClient::RequestBuilderImpl(IdentityOf(m_service, "client"), FullDialect(), m_service.GetUrl())
      .BuildRenewRequest(TokenIn(Post(CertificateBody(FullDialect(), RenewableSpec()))), 3600, renewal);
  const HttpAnswer renewed = Send(m_service, renewal);
  ASSERT_TRUE(IsIssued(renewed));
  EXPECT_EQ("http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0",
            Between(renewed.body, "<wst:TokenType>", "<"));
  EXPECT_EQ("urn:oasis:names:tc:SAML:2.0:assertion",
            Between(Post(CertificateBody(ServiceDialect())).body, "<wst:TokenType>", "<"));
}

TEST_F(Dialects, WithoutUseKeyGetATokenForTheKeyThatSigned) {
  ServiceDialect dialect;
  dialect.useKey = ServiceDialect::UseKey::NEVER;
  const Token token = Client(dialect, "other-client")->AcquireTokenByCertificate(PlainSpec());
  EXPECT_EQ(IdentityOf(m_service, "other-client").certificate->GetDer(), token->GetConfirmationCertificate()->GetDer());
}

TEST_F(Dialects, WithACertificateThatDidNotSignAreRefused) {
  ServiceDialect dialect;
  dialect.useKey = ServiceDialect::UseKey::CERTIFICATE;
  const auto identity = IdentityOf(m_service, "client");
  SsoClient::HolderOfKeyConfig mixed = identity;
  mixed.certificate = IdentityOf(m_service, "other-client").certificate;
  SsoClient::Request request;
  const Token token = Client(dialect, "client")->AcquireTokenByCertificate(PlainSpec());
  // The signature is checked with the key of the presented token, and not with the certificate of the identity.
  SsoClient::RequestBuilderImpl(mixed, dialect, "").BuildExchangeTokenRequest(*token, PlainSpec(), request);
  EXPECT_TRUE(IsRefused(Post(request.body), "wst:InvalidRequest",
                        "wst:UseKey does not contain the certificate of the message's signature"));
  SsoClient::RequestBuilderImpl(identity, dialect, "").BuildExchangeTokenRequest(*token, PlainSpec(), request);
  EXPECT_TRUE(IsIssued(Post(request.body)));
}

TEST_F(Dialects, OnBehalfOfAnotherUserGetATokenAboutThatUser) {
  TokenSpec spec = PlainSpec();
  spec.delegateTo = std::string("bob@corp.example");
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  const Token byPassword = Client(OnBehalfOf())->AcquireToken("alice@corp.example", "wonderland", spec);
  EXPECT_EQ("bob@corp.example", NameOf(byPassword->GetSubject()));
  EXPECT_TRUE(byPassword->GetDelegationChain().empty());
  EXPECT_EQ(SamlToken::BEARER, byPassword->GetConfirmationMethod());
  ASSERT_EQ(1u, byPassword->GetGroups().size()); // bob's, not alice's
  EXPECT_EQ("users@corp.example", NameOf(byPassword->GetGroups()[0]));

  spec.confirmation = TokenSpec::CONFIRMATION_DEFAULT;
  const auto client = Client(OnBehalfOf(), "client");
  const Token byCertificate = client->AcquireTokenByCertificate(spec);
  EXPECT_EQ("bob@corp.example", NameOf(byCertificate->GetSubject()));
  EXPECT_FALSE(byCertificate->IsSolution());
  EXPECT_EQ(IdentityOf(m_service, "client").certificate->GetDer(),
            byCertificate->GetConfirmationCertificate()->GetDer());
  const Token byToken =
      client->AcquireTokenByToken(*client->AcquireToken("alice@corp.example", "wonderland", PlainSpec()), spec);
  EXPECT_EQ("bob@corp.example", NameOf(byToken->GetSubject()));
  EXPECT_TRUE(byToken->GetDelegationChain().empty());
}

TEST_F(Dialects, OnBehalfOfAnotherUserAreRefusedWithAWrongPassword) {
  EXPECT_TRUE(IsRefused(Post(Replaced(PasswordBody(OnBehalfOf(), "bob@corp.example"), "wonderland", "looking-glass")),
                        "wst:FailedAuthentication", "unknown user or wrong password"));
}

TEST_F(Dialects, OnBehalfOfAnUnknownOrMalformedPartyAreRefused) {
  EXPECT_TRUE(IsRefused(Post(PasswordBody(OnBehalfOf(), "carol@corp.example")), "wst:RequestFailed",
                        "unknown user carol@corp.example in wst:OnBehalfOf"));
  EXPECT_TRUE(IsRefused(Post(PasswordBody(OnBehalfOf(), "bob")), "wst:InvalidRequest",
                        "the party 'bob' is not of the form name@domain"));
}

TEST_F(Dialects, ThatDelegateInTwoWaysOrByActAsAreRefused) {
  const std::string body = PasswordBody(ServiceDialect(), "bob@corp.example");
  const std::string delegate = "<wst:DelegateTo>" + Between(body, "<wst:DelegateTo>", "</wst:DelegateTo>");
  const std::string onBehalfOf =
      "<wst:OnBehalfOf>" + Between(body, "<wst:DelegateTo>", "</wst:DelegateTo>") + "</wst:OnBehalfOf>";
  EXPECT_TRUE(IsRefused(Post(Replaced(body, delegate, onBehalfOf + delegate)), "wst:InvalidRequest",
                        "the request has both wst:DelegateTo and wst:OnBehalfOf"));
  ServiceDialect actAs;
  actAs.delegation = ServiceDialect::Delegation::ACT_AS;
  EXPECT_TRUE(IsRefused(Post(PasswordBody(actAs, "bob@corp.example")), "wst:InvalidRequest",
                        "wst14:ActAs is of WS-Trust 1.4; this service has version 1.3"));
}

TEST_F(Dialects, WithAnEmptyUseKeyAreRefused) {
  // The request has no signature: wst:UseKey is examined first.
  EXPECT_TRUE(IsRefused(Post(Replaced(PasswordRequest().body, "<wst:Lifetime ", "<wst:UseKey/><wst:Lifetime ")),
                        "wst:InvalidRequest", "wst:UseKey refers to no signature and contains no ds:KeyInfo"));
}

TEST_F(Dialects, WithHeadersOfAddressingAreServedUnlessASignedHeaderIsChanged) {
  ServiceDialect dialect;
  dialect.addressing = true;
  const std::string body = CertificateBody(dialect);
  EXPECT_TRUE(IsIssued(Post(body)));
  const std::string action = Between(body, "<wsa:Action ", "</wsa:Action>");
  EXPECT_TRUE(
      IsRefused(Post(Replaced(body, action, action + "x")), "wsse:FailedCheck", "the message's signature is wrong"));
  // A header that is added after signing is not signed, and the service does not read it.
  const std::string plain = CertificateBody(ServiceDialect());
  EXPECT_TRUE(IsIssued(Post(Replaced(
      plain, "</soapenv:Header>", "<To xmlns=\"http://www.w3.org/2005/08/addressing\">urn:x</To></soapenv:Header>"))));
}

TEST_F(Dialects, WithASignedHeaderOfAddressingAtAnotherPlaceAreRefused) {
  ServiceDialect dialect;
  dialect.addressing = true;
  const std::string body = CertificateBody(dialect);
  const std::string action = "<wsa:Action " + Between(body, "<wsa:Action ", "</wsa:Action>") + "</wsa:Action>";
  EXPECT_TRUE(IsRefused(Post(Replaced(Replaced(body, action, ""), "<wst:TokenType>", action + "<wst:TokenType>")),
                        "wsse:InvalidSecurity",
                        "the signature must cover the body and the timestamp, and nothing else but headers of "
                        "WS-Addressing"));
}

TEST_F(Dialects, WithAnyOtherHeaderAreRefused) {
  constexpr const char *HEADERS = "the message must have one security header and no other";
  const std::string body = PasswordRequest().body;
  for (const std::string header : {"<wsa:To xmlns:wsa=\"urn:other\"/>", "<To/>"}) {
    EXPECT_TRUE(IsRefused(Post(Replaced(body, "</soapenv:Header>", header + "</soapenv:Header>")),
                          "wsse:InvalidSecurity", HEADERS));
  }
  const std::string security =
      "<wsse:Security " + Between(body, "<wsse:Security ", "</wsse:Security>") + "</wsse:Security>";
  EXPECT_TRUE(IsRefused(Post(Replaced(body, security, security + security)), "wsse:InvalidSecurity", HEADERS));
}

TEST_F(Dialects, WithAnUnknownTokenTypeAreRefused) {
  ServiceDialect dialect;
  dialect.tokenType = "urn:other";
  EXPECT_TRUE(IsRefused(Post(CertificateBody(dialect)), "wst:InvalidRequest", "unsupported token type 'urn:other'"));
}

} // namespace
} // namespace DevStsTest
