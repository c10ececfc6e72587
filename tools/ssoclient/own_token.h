// SPDX-License-Identifier: Apache-2.0
/// @file
/// A token that the caller has acquired, and presents to a service.

#pragma once

#include "output.h"
#include "trust.h"

#include <ssoclient/saml_token.h>
#include <tarvel/crypto/certificate.h>

#include <memory>
#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

/// Adds the options of `AddTrustOptions`, except that --trust is not required.
void AddOwnTokenOptions(CLI::App &app, TrustOptions &options);

/// The certificates in the `ds:KeyInfo` of the signature of the assertion `xml`. Those that cannot be read are left out.
/// Empty, too, if `xml` is not well-formed.
Tarvel::Crypto::CertificateList CertificatesOfSignature(const std::string &xml);

/// The token in `file`, verified with the trusted certificates. If there are none, its signature is verified with the
/// certificate in the token. This finds damage, and does not show who issued the token; a service that receives the token
/// checks that.
/// @throws UsageException when there is no certificate. @throws what `ReadToken` throws
std::shared_ptr<const SamlToken> ReadOwnToken(const std::string &file, const TrustOptions &options,
                                              const OutputOptions &output);

} // namespace SsoClient::Tool
