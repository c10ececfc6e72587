// SPDX-License-Identifier: Apache-2.0
// The functions that return their result: each returns what its overload with an out-parameter sets.

#include "support/data_file.h"
#include "support/reporting_ssl_context.h"

#include <ssoclient/connection_spec.h>
#include <ssoclient/create_saml_token.h>

#include <gtest/gtest.h>

#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using Texts = std::vector<std::string>;
using Tarvel::Http::ConnectionSpec;

std::shared_ptr<const SamlToken> Token(const std::string &name) {
  return CreateSamlToken(Testing::ReadDataFile("tokens/" + name + ".xml"),
                         Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt")));
}

TEST(SamlToken, ReturnsTheFullName) {
  EXPECT_EQ(Token("full")->GetFullName(), std::make_pair(std::string("Alice"), std::string("Liddell")));
}

TEST(SamlToken, ReturnsTheGroups) {
  const auto token = Token("full");
  std::vector<PrincipalId> groups;
  token->GetGroups(groups);
  EXPECT_EQ(groups.size(), 3u);
  EXPECT_EQ(token->GetGroups(), groups);
}

TEST(SamlToken, ReturnsTheDelegationChain) {
  const auto token = Token("full");
  std::vector<Delegate> set;
  token->GetDelegationChain(set);
  const std::vector<Delegate> returned = token->GetDelegationChain();
  ASSERT_EQ(set.size(), 2u);
  ASSERT_EQ(returned.size(), 2u);
  for (std::size_t i = 0; i < 2; ++i) {
    EXPECT_EQ(returned[i].subject, set[i].subject);
    EXPECT_EQ(returned[i].delegationInstant, set[i].delegationInstant);
  }
}

TEST(SamlToken, ReturnsTheAudience) {
  const auto token = Token("full");
  std::set<std::string> audience;
  token->GetAudience(audience);
  EXPECT_FALSE(audience.empty());
  EXPECT_EQ(token->GetAudience(), audience);
}

TEST(SamlToken, ReturnsTheAdvice) {
  const auto token = Token("full");
  std::vector<Advice> set;
  token->GetAdvice(set);
  const std::vector<Advice> returned = token->GetAdvice();
  ASSERT_FALSE(set.empty());
  ASSERT_EQ(returned.size(), set.size());
  for (std::size_t i = 0; i < set.size(); ++i) {
    EXPECT_EQ(returned[i].source, set[i].source);
    ASSERT_EQ(returned[i].attributes.size(), set[i].attributes.size());
    for (std::size_t j = 0; j < set[i].attributes.size(); ++j) {
      EXPECT_EQ(returned[i].attributes[j].name, set[i].attributes[j].name);
      EXPECT_EQ(returned[i].attributes[j].values, set[i].attributes[j].values);
    }
  }
}

Texts HostAndEndpoint(const ConnectionSpec &spec) {
  return {spec.GetHost(), spec.GetEndpointString()};
}

TEST(CreateSsoConnectionSpec, ReturnsOrSetsASpecificationOfThatAddress) {
  const auto returned = CreateSsoConnectionSpec("sts.example", 7080, false);
  EXPECT_EQ(HostAndEndpoint(*returned), (Texts{"sts.example", "sts.example:7080"}));
  auto set = returned;
  CreateSsoConnectionSpec("other.example", 80, false, set);
  EXPECT_EQ(HostAndEndpoint(*set), (Texts{"other.example", "other.example:80"}));
}

TEST(CreateSsoSSLConnectionSpec, ReturnsOrSetsASpecificationOfThatAddress) {
  const auto returned = CreateSsoSSLConnectionSpec("sts.example", 7443, nullptr, "", false);
  EXPECT_EQ(HostAndEndpoint(*returned), (Texts{"sts.example", "sts.example:7443"}));
  auto set = returned;
  CreateSsoSSLConnectionSpec("other.example", 443, nullptr, "", false, set);
  EXPECT_EQ(HostAndEndpoint(*set), (Texts{"other.example", "other.example:443"}));
}

TEST(CreateSsoSSLConnectionSpec, KeepsTheContextUntilTheSpecificationIsDestroyed) {
  const auto isDestroyed = std::make_shared<bool>(false);
  auto spec = CreateSsoSSLConnectionSpec("sts.example", 7443,
                                         Tarvel::MakeRef<Testing::ReportingSslContext>(isDestroyed), "", false);
  EXPECT_FALSE(*isDestroyed);
  spec.reset();
  EXPECT_TRUE(*isDestroyed);
}

} // namespace
