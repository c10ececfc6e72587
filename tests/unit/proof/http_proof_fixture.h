// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the tests of `VerifyHttpProof` share.

#pragma once

#include "support/fixed_environment.h"
#include "support/throws_message.h"
#include "unit/proof/http_requests.h"

#include <ssoclient/proof/http_proof.h>

#include <gtest/gtest.h>

#include <string>

namespace Testing {

/// The message of a signature that does not verify.
constexpr const char *NOT_GENUINE =
    "The signature was not made by the token's key, or the request was changed after it was signed";

/// Verifies requests at the time of the fixtures.
class VerifyHttpProofTest : public ::testing::Test {
protected:
  SsoClient::VerifiedHttpRequest Verify(const SsoClient::HttpRequest &request) const {
    return VerifyHttpProof(request, m_tokens, options);
  }

  template <typename Exception>
  void ExpectRefusal(const SsoClient::HttpRequest &request, const std::string &message) const {
    EXPECT_THROWS_MESSAGE(Verify(request), Exception, message);
  }

  SsoClient::HttpProofOptions options;

private:
  const FixedEnvironment m_environment;
  const SsoClient::TokenVerifier m_tokens = HttpTokenVerifier(SsoClient::TokenProfile::SAML2);
};

} // namespace Testing
