// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/create_saml_token.h>
#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/negotiation_handler.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/token_spec.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <set>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;

// Deleting through an interface must not compile.
static_assert(!std::has_virtual_destructor_v<SamlToken> && !std::is_destructible_v<SamlToken>);
static_assert(!std::has_virtual_destructor_v<NegotiationHandler> && !std::is_destructible_v<NegotiationHandler>);

static_assert(SamlToken::BEARER == 0 && SamlToken::HOLDER_OF_KEY == 1);
static_assert(TokenSpec::CONFIRMATION_DEFAULT == 0 && TokenSpec::CONFIRMATION_NONE == 1);
static_assert(sizeof(TokenSpec::Confirmation) == 4);

static_assert(std::is_copy_constructible_v<TokenSpec> && std::is_nothrow_move_constructible_v<TokenSpec>);
static_assert(!std::is_copy_assignable_v<TokenSpec> && !std::is_move_assignable_v<TokenSpec>);
static_assert(std::is_aggregate_v<PrincipalId> && std::is_aggregate_v<Delegate> && std::is_aggregate_v<Advice> &&
              std::is_aggregate_v<AdviceAttribute> && std::is_aggregate_v<HolderOfKeyConfig>);

TokenSpec MakeSpec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  spec.audienceRestriction = {"b", "a", "b"};
  spec.advice = {{"source", {{"name", {"value"}}}}};
  spec.delegable = true;
  spec.delegateTo = std::string("gateway");
  spec.renewable = true;
  spec.confirmation = TokenSpec::CONFIRMATION_NONE;
  return spec;
}

void ExpectAllFields(const TokenSpec &spec) {
  EXPECT_EQ(3600, spec.tokenLifetimeSec);
  EXPECT_EQ((std::set<std::string>{"a", "b"}), spec.audienceRestriction);
  ASSERT_EQ(1u, spec.advice.size());
  EXPECT_EQ("source", spec.advice[0].source);
  ASSERT_EQ(1u, spec.advice[0].attributes.size());
  EXPECT_EQ("name", spec.advice[0].attributes[0].name);
  EXPECT_EQ(std::vector<std::string>{"value"}, spec.advice[0].attributes[0].values);
  EXPECT_TRUE(spec.delegable);
  ASSERT_TRUE(spec.delegateTo);
  EXPECT_EQ("gateway", *spec.delegateTo);
  EXPECT_TRUE(spec.renewable);
  EXPECT_EQ(TokenSpec::CONFIRMATION_NONE, spec.confirmation);
}

TEST(TokenSpec, StartsWithNothingRequested) {
  const TokenSpec spec;
  EXPECT_EQ(0, spec.tokenLifetimeSec);
  EXPECT_TRUE(spec.audienceRestriction.empty());
  EXPECT_TRUE(spec.advice.empty());
  EXPECT_FALSE(spec.delegable);
  EXPECT_FALSE(spec.delegateTo);
  EXPECT_FALSE(spec.renewable);
  EXPECT_EQ(TokenSpec::CONFIRMATION_DEFAULT, spec.confirmation);
}

TEST(TokenSpec, KeepsZeroAndNegativeLifetimes) {
  TokenSpec spec;
  for (const std::int64_t lifetime : {std::int64_t{0}, std::int64_t{-1}, std::numeric_limits<std::int64_t>::min()}) {
    spec.tokenLifetimeSec = lifetime;
    EXPECT_EQ(lifetime, TokenSpec(spec).tokenLifetimeSec);
  }
}

TEST(TokenSpec, CopyHasAllFieldsAndDoesNotChangeItsSource) {
  const TokenSpec source = MakeSpec();
  const TokenSpec copy(source);
  ExpectAllFields(copy);
  ExpectAllFields(source);
}

TEST(TokenSpec, MoveHasAllFieldsAndLeavesAudienceAndAdviceEmpty) {
  TokenSpec source = MakeSpec();
  const TokenSpec moved(std::move(source));
  ExpectAllFields(moved);
  EXPECT_TRUE(source.audienceRestriction.empty()); // NOLINT(bugprone-use-after-move): what is left is promised
  EXPECT_TRUE(source.advice.empty());
}

TEST(SecurityTokenServiceConfig, StartsEmpty) {
  const SecurityTokenServiceConfig config;
  EXPECT_EQ("", config.stsUrl);
  EXPECT_TRUE(config.signingCertificates.empty());
  EXPECT_EQ("", config.sslParameter);
  EXPECT_FALSE(config.holderOfKeyConfig);
  EXPECT_EQ(nullptr, config.sslContext);
  EXPECT_FALSE(config.useDomainControllerName);
}

std::vector<std::string> released;

class RecordedKey final : public Tarvel::Crypto::PrivateKey {
public:
  ~RecordedKey() override { released.emplace_back("key"); }
  std::string GetAlgorithm() const override { return "RSA"; }
  unsigned GetBits() const override { return 2048; }
};

class RecordedCertificate final : public Tarvel::Crypto::Certificate {
public:
  ~RecordedCertificate() override { released.emplace_back("certificate"); }
  const std::vector<std::uint8_t> &GetDer() const noexcept override { return m_der; }
  std::string GetSubject() const override { return {}; }
  std::string GetIssuer() const override { return {}; }
  std::string GetSha256Thumbprint() const override { return {}; }
  Tarvel::System::DateTime GetNotBefore() const override { return {}; }
  Tarvel::System::DateTime GetNotAfter() const override { return {}; }
  std::string ToPem() const override { return {}; }

private:
  std::vector<std::uint8_t> m_der;
};

TEST(HolderOfKeyConfig, SharesBothWithItsCopiesAndReleasesTheCertificateFirst) {
  released.clear();
  {
    boost::optional<HolderOfKeyConfig> copy;
    {
      const HolderOfKeyConfig config{Tarvel::MakeRef<RecordedKey>(), Tarvel::MakeRef<RecordedCertificate>()};
      copy = config;
      EXPECT_EQ(config.privateKey, copy->privateKey);
      EXPECT_EQ(config.certificate, copy->certificate);
    }
    EXPECT_TRUE(released.empty());
  }
  EXPECT_EQ((std::vector<std::string>{"certificate", "key"}), released);
}

} // namespace
