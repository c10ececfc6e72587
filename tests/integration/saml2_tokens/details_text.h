// SPDX-License-Identifier: Apache-2.0
/// @file
/// `DescribeDetails`, what a token states, in the form of tests/data/saml2/details.txt.

#pragma once

#include <ssoclient/saml_token.h>
#include <ssoclient/token_details.h>

#include <string>

namespace Testing {

/// The facts of `GetTokenDetails(token)`, one on each line.
/// @throws std::logic_error if `GetNameId` or `GetAttributes` returns something else than `GetTokenDetails`.
std::string DescribeDetails(const SsoClient::SamlToken &token);

/// An identifier: " value {...} format {...}" and so on, and a line end.
std::string DescribeName(const SsoClient::NameId &name);

} // namespace Testing
