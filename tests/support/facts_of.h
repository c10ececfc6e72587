// SPDX-License-Identifier: Apache-2.0
/// @file
/// `FactsOf`, everything that a token says.

#pragma once

#include <ssoclient/saml_token.h>

#include <string>

namespace Testing {

/// Every fact of the token except its text, one on each line: two tokens have the same facts if these texts are equal.
std::string FactsOf(const SsoClient::SamlToken &token);

} // namespace Testing
