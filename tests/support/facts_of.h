// SPDX-License-Identifier: Apache-2.0
/// @file
/// `FactsOf`, everything that a token says.

#pragma once

#include <ssoclient/saml_token.h>

#include <string>

namespace Testing {

/// Every fact of the token but its text, one a line, so that two tokens say the same when these texts are equal.
std::string FactsOf(const SsoClient::SamlToken &token);

} // namespace Testing
