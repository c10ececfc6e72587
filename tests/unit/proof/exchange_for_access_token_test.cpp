// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/exchange_for_access_token.h>

#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Tarvel::InvalidArgumentException;

const Testing::TokenStandIn TOKEN("_1", "<a>\xC3\xBF~</a>", SamlToken::BEARER);
constexpr const char *ENCODED_TOKEN = "PGE-w79-PC9hPg"; // by Python's urlsafe_b64encode, without the padding

TEST(ExchangeForAccessToken, HasTheParametersOfTheBearerGrant) {
  const AccessTokenRequest request = ExchangeForAccessToken(TOKEN);
  ASSERT_EQ(request.parameters.size(), 2U);
  EXPECT_EQ(request.parameters[0].first, "grant_type");
  EXPECT_EQ(request.parameters[0].second.Get(), "urn:ietf:params:oauth:grant-type:saml2-bearer");
  EXPECT_EQ(request.parameters[1].first, "assertion");
  EXPECT_EQ(request.parameters[1].second.Get(), ENCODED_TOKEN);
  EXPECT_EQ(request.body.Get(),
            std::string("grant_type=urn%3Aietf%3Aparams%3Aoauth%3Agrant-type%3Asaml2-bearer&assertion=") +
                ENCODED_TOKEN);
}

TEST(ExchangeForAccessToken, AddsWhatTheOptionsHaveInAFixedOrder) {
  AccessTokenOptions options;
  options.scope = "read write:all*";
  options.clientId = "my client&%~+";
  options.resources = {"https://one.example/?a=b", "urn:two"};
  const AccessTokenRequest request = ExchangeForAccessToken(TOKEN, options);
  ASSERT_EQ(request.parameters.size(), 6U);
  EXPECT_EQ(request.parameters[2].second.Get(), "read write:all*");
  EXPECT_EQ(request.body.Get(),
            std::string("grant_type=urn%3Aietf%3Aparams%3Aoauth%3Agrant-type%3Asaml2-bearer&assertion=") +
                ENCODED_TOKEN +
                "&scope=read+write%3Aall*&client_id=my+client%26%25%7E%2B&resource=https%3A%2F%2Fone.example%2F%3Fa%3Db"
                "&resource=urn%3Atwo");
}

TEST(ExchangeForAccessToken, RefusesAHolderOfKeyToken) {
  EXPECT_THROWS_MESSAGE(
      ExchangeForAccessToken(Testing::TokenStandIn("_1", "<a/>", SamlToken::HOLDER_OF_KEY)), InvalidArgumentException,
      "Invalid argument : Only a bearer token can be exchanged for an access token (RFC 7522, section 3)");
}

TEST(ExchangeForAccessToken, RefusesScopesOfAnotherForm) {
  for (const char *const scope : {"", " ", "a ", " a", "a  b", "a\"", "a\\", "a\tb", "\xC3\xA4"}) {
    AccessTokenOptions options;
    options.scope = scope;
    EXPECT_THROWS_MESSAGE(
        ExchangeForAccessToken(TOKEN, options), InvalidArgumentException,
        "Invalid argument : AccessTokenOptions::scope is not a list of scopes with one blank between two of them");
  }
}

TEST(ExchangeForAccessToken, RefusesClientsAndResourcesOfAnotherForm) {
  AccessTokenOptions options;
  options.clientId = "a\n";
  EXPECT_THROWS_MESSAGE(ExchangeForAccessToken(TOKEN, options), InvalidArgumentException,
                        "Invalid argument : AccessTokenOptions::clientId must be printable ASCII");
  for (const char *const resource :
       {"", "a", ":a", "1a:b", "a_b:c", "https://a/#b", "https://a/ b", "https://a/\xC3\xA4"}) {
    options = {};
    options.resources = {"https://a/", resource};
    EXPECT_THROWS_MESSAGE(
        ExchangeForAccessToken(TOKEN, options), InvalidArgumentException,
        "Invalid argument : AccessTokenOptions::resources has a text that is not an absolute URI without a fragment");
  }
}

} // namespace
