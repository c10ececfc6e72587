// SPDX-License-Identifier: Apache-2.0
// The library's client with the development service: the token has what was asked for.

#include "messages.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>
#include <ssoclient/security_token_service_config.h>
#include <tarvel/ssl/ssl_context.h>

#include <gmock/gmock.h>

namespace DevStsTest {
namespace {

using SsoClient::PrincipalId;
using SsoClient::SamlToken;
using SsoClient::TokenSpec;
using testing::AllOf;
using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;
using testing::Pair;

using Token = std::shared_ptr<const SamlToken>;

testing::Matcher<const PrincipalId &> Is(const char *name, const char *domain) {
  return AllOf(Field(&PrincipalId::name, name), Field(&PrincipalId::domain, domain));
}

std::vector<PrincipalId> GroupsOf(const Token &token) {
  std::vector<PrincipalId> groups;
  token->GetGroups(groups);
  return groups;
}

std::pair<std::string, std::string> FullNameOf(const Token &token) {
  std::pair<std::string, std::string> name;
  token->GetFullName(name);
  return name;
}

std::vector<std::string> DelegatesOf(const Token &token) {
  std::vector<SsoClient::Delegate> chain;
  token->GetDelegationChain(chain);
  std::vector<std::string> names;
  for (const SsoClient::Delegate &delegate : chain) {
    names.push_back(delegate.subject.name + "@" + delegate.subject.domain);
  }
  return names;
}

std::set<std::string> AudienceOf(const Token &token) {
  std::set<std::string> audience;
  token->GetAudience(audience);
  return audience;
}

std::vector<SsoClient::Advice> AdviceOf(const Token &token) {
  std::vector<SsoClient::Advice> advice;
  token->GetAdvice(advice);
  return advice;
}

std::int64_t LifetimeOf(const Token &token) {
  return (token->GetEndDate().GetUtcTime() - token->GetStartDate().GetUtcTime()) / 1000000;
}

class IssuedTokens : public testing::Test {
protected:
  std::shared_ptr<SsoClient::SecurityTokenService> Client(const std::string &identity = {}) {
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = m_service.GetUrl();
    config.signingCertificates = {Tarvel::Crypto::CreateCertificateFromPem(m_service.ReadStateFile("signing.crt"))};
    m_tls->TrustFile(m_service.PathOf("authority.crt"));
    config.sslContext = m_tls.get();
    if (!identity.empty()) {
      config.holderOfKeyConfig = IdentityOf(m_service, identity);
    }
    return SsoClient::CreateSecurityTokenService(config);
  }
  Token ByPassword(const TokenSpec &spec) { return Client()->AcquireToken("alice@corp.example", "wonderland", spec); }

  Testing::DevSts m_service;
  Tarvel::Ref<Tarvel::Ssl::SSLContext> m_tls = Tarvel::Ssl::CreateSSLContext();
};

TEST_F(IssuedTokens, IdentifyTheUser) {
  const Token token = ByPassword(PlainSpec());
  EXPECT_THAT(token->GetSubject(), Is("alice", "corp.example"));
  EXPECT_THAT(GroupsOf(token), ElementsAre(Is("admins", "corp.example"), Is("users", "corp.example")));
  EXPECT_THAT(FullNameOf(token), Pair("Alice", "Liddell"));
  EXPECT_FALSE(token->IsSolution());
}

TEST_F(IssuedTokens, IdentifyTheHolderOfTheCertificate) {
  const Token token = Client("client")->AcquireTokenByCertificate(PlainSpec());
  EXPECT_THAT(token->GetSubject(), Is("client", "corp.example"));
  EXPECT_THAT(GroupsOf(token), IsEmpty());
  EXPECT_THAT(FullNameOf(token), Pair("", ""));
  EXPECT_TRUE(token->IsSolution());
}

TEST_F(IssuedTokens, AreNeitherRenewableNorDelegableNorRestrictedUnlessAskedFor) {
  const Token token = ByPassword(PlainSpec());
  EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::BEARER);
  EXPECT_FALSE(token->GetConfirmationCertificate());
  EXPECT_FALSE(token->IsRenewable());
  EXPECT_FALSE(token->IsDelegable());
  EXPECT_THAT(AudienceOf(token), IsEmpty());
  EXPECT_THAT(AdviceOf(token), IsEmpty());
  EXPECT_THAT(DelegatesOf(token), IsEmpty());
}

TEST_F(IssuedTokens, AreValidForAsLongAsAskedFor) {
  TokenSpec spec = PlainSpec();
  spec.tokenLifetimeSec = 4321;
  EXPECT_EQ(LifetimeOf(ByPassword(spec)), 4321);
}

TEST_F(IssuedTokens, HaveWhatTheSpecAsksFor) {
  TokenSpec spec = RenewableSpec();
  spec.audienceRestriction = {"https://files.example/", "https://mail.example/"};
  spec.advice = {{"urn:mapper", {{"colour", {"red <&> green", "blue"}}, {"none", {}}}}, {"urn:audit", {}}};
  const Token token = ByPassword(spec);
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_TRUE(token->IsDelegable());
  EXPECT_THAT(AudienceOf(token), ElementsAre("https://files.example/", "https://mail.example/"));
  const std::vector<SsoClient::Advice> advice = AdviceOf(token);
  ASSERT_EQ(advice.size(), 2U);
  EXPECT_EQ(advice[0].source, "urn:mapper");
  ASSERT_EQ(advice[0].attributes.size(), 2U);
  EXPECT_EQ(advice[0].attributes[0].name, "colour");
  EXPECT_THAT(advice[0].attributes[0].values, ElementsAre("red <&> green", "blue"));
  EXPECT_EQ(advice[0].attributes[1].name, "none");
  EXPECT_THAT(advice[0].attributes[1].values, IsEmpty());
  EXPECT_EQ(advice[1].source, "urn:audit");
  EXPECT_THAT(advice[1].attributes, IsEmpty());
}

TEST_F(IssuedTokens, ConfirmTheKeyThatSignedThePasswordRequest) {
  const Token token = Client("client")->AcquireToken("alice@corp.example", "wonderland", PlainSpec());
  EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::HOLDER_OF_KEY);
  EXPECT_THAT(token->GetSubject(), Is("alice", "corp.example"));
  ASSERT_TRUE(token->GetConfirmationCertificate());
  EXPECT_EQ(token->GetConfirmationCertificate()->GetDer(), IdentityOf(m_service, "client").certificate->GetDer());
}

TEST_F(IssuedTokens, ExchangeKeepsTheSubjectAndLengthensTheDelegationChain) {
  const auto client = Client("client");
  TokenSpec spec = RenewableSpec();
  const Token first = client->AcquireToken("alice@corp.example", "wonderland", spec);
  spec.delegateTo = std::string("gateway@corp.example");
  const Token second = client->AcquireTokenByToken(*first, spec);
  spec.delegateTo = std::string("backup@corp.example");
  const Token third = client->AcquireTokenByToken(*second, spec);
  EXPECT_THAT(third->GetSubject(), Is("alice", "corp.example"));
  EXPECT_THAT(FullNameOf(third), Pair("Alice", "Liddell"));
  EXPECT_THAT(GroupsOf(third), ElementsAre(Is("admins", "corp.example"), Is("users", "corp.example")));
  EXPECT_THAT(DelegatesOf(third), ElementsAre("gateway@corp.example", "backup@corp.example"));
  EXPECT_EQ(third->GetConfirmationMethod(), SamlToken::HOLDER_OF_KEY);
}

TEST_F(IssuedTokens, ExchangeForABearerToken) {
  const auto client = Client("client");
  TokenSpec spec = PlainSpec();
  const Token first = client->AcquireTokenByCertificate(spec);
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  EXPECT_EQ(client->AcquireTokenByToken(*first, spec)->GetConfirmationMethod(), SamlToken::BEARER);
}

TEST_F(IssuedTokens, RenewalKeepsEverythingButTheDates) {
  const auto client = Client("client");
  TokenSpec spec = RenewableSpec();
  spec.audienceRestriction = {"https://files.example/"};
  spec.advice = {{"urn:mapper", {}}};
  const Token token = client->AcquireToken("alice@corp.example", "wonderland", spec);
  const Token renewed = client->RenewToken(*token, 7200);
  EXPECT_NE(renewed->GetId(), token->GetId());
  EXPECT_EQ(LifetimeOf(renewed), 7200);
  EXPECT_THAT(renewed->GetSubject(), Is("alice", "corp.example"));
  EXPECT_THAT(FullNameOf(renewed), Pair("Alice", "Liddell"));
  EXPECT_EQ(GroupsOf(renewed).size(), 2U);
  EXPECT_EQ(AudienceOf(renewed), AudienceOf(token));
  EXPECT_EQ(AdviceOf(renewed).size(), 1U);
  EXPECT_TRUE(renewed->IsRenewable());
  EXPECT_TRUE(renewed->IsDelegable());
  EXPECT_EQ(renewed->GetConfirmationMethod(), SamlToken::HOLDER_OF_KEY);
}

TEST_F(IssuedTokens, AreValidForTheService) {
  const auto client = Client();
  EXPECT_TRUE(client->ValidateSubject(*ByPassword(PlainSpec())));
}

} // namespace
} // namespace DevStsTest
