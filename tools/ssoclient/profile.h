// SPDX-License-Identifier: Apache-2.0
/// @file
/// The profile of the tokens that a command accepts, and a hint about the other profile.

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

/// A hint for a token that is refused with `options`: that the profile SAML2 accepts it, or why SAML2 refuses it, too.
/// Empty if `options` have the profile SAML2, or if both profiles refuse the token for the same reason.
std::string OtherProfileHint(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                             const VerifyOptions &options);

} // namespace SsoClient::Tool
