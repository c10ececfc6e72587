// SPDX-License-Identifier: Apache-2.0
/// @file
/// The profile of tokens that a command accepts, and what the other profile would say.

#pragma once

#include <ssoclient/verify_options.h>
#include <tarvel/crypto/certificate.h>

#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

/// Adds --profile, whose argument is stored in `profile`.
void AddProfileOption(CLI::App &app, std::string &profile);

/// The profile of that name: "strict" or "saml2".
TokenProfile ProfileOf(const std::string &name) noexcept;

/// Whether the profile SAML2 would accept a token that is refused with `options`, or why not. Empty if the options have
/// that profile already, or if it refuses the token for the same reason.
std::string OtherProfileHint(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                             const VerifyOptions &options);

} // namespace SsoClient::Tool
