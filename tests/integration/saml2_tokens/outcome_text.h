// SPDX-License-Identifier: Apache-2.0
/// @file
/// The outcome for a token in the profile SAML2, in one line; and the verifiers of these tests.

#pragma once

#include <ssoclient/token_verifier.h>

#include <string>

namespace Testing {

/// The default options, with the profile SAML2.
SsoClient::VerifyOptions Saml2Options();

/// A verifier that trusts tests/data/tokens/sts-rsa.crt.
SsoClient::TokenVerifier VerifierWith(const SsoClient::VerifyOptions &options);

/// The exception's unqualified class, a tab and its message; or "accepted", a tab and what the library derived from the
/// assertion: subject, confirmation with its index, dates and audience.
std::string OutcomeOf(const SsoClient::TokenVerifier &verifier, const std::string &xml);

/// What `OutcomeOf` returns for an accepted token, after the tab.
std::string DescribeOutcome(const SsoClient::SamlToken &token);

} // namespace Testing
