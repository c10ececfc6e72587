// SPDX-License-Identifier: Apache-2.0
/// @file
/// The certificates that a command trusts, and the tokens that it reads.

#pragma once

#include "option.h"
#include "output.h"
#include "profile.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/service_options.h>
#include <tarvel/crypto/certificate.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct TrustOptions {
  std::vector<std::string> files;
  std::int64_t toleranceSec = DEFAULT_CLOCK_TOLERANCE_SEC;
  std::string profile;
};

/// Adds --trust, --tolerance and --profile. --trust is required.
void AddTrustOptions(CLI::App &app, TrustOptions &options);

/// Adds --trust with this help.
Option AddTrustOption(CLI::App &app, TrustOptions &options, const std::string &help);

/// Adds --tolerance and --profile.
void AddTokenFormOptions(CLI::App &app, TrustOptions &options);

/// Tolerance and profile of `options`.
VerifyOptions VerifyOptionsOf(const TrustOptions &options);

/// Adds the argument FILE, a token.
void AddTokenArgument(CLI::App &app, std::string &file);

/// The certificates of all trust files. Warns of those that are out of date.
/// @throws Tarvel::IOException, Tarvel::Crypto::CryptoException
Tarvel::Crypto::CertificateList LoadTrusted(const TrustOptions &options, const OutputOptions &output);

/// The content of `file` ("-" is standard input). Reads at most one octet more than
/// the parser accepts, so that the parser refuses a longer file.
/// @throws Tarvel::IOException
std::string ReadTokenText(const std::string &file);

/// The token in `file`, verified.
/// @throws Tarvel::IOException
/// @throws HintedException for a token that is refused: the exception of `TokenVerifier::Verify`, with a hint.
std::shared_ptr<const SamlToken> ReadToken(const std::string &file, const Tarvel::Crypto::CertificateList &trusted,
                                           const VerifyOptions &options);

/// The token `xml`, verified.
/// @throws HintedException as `ReadToken` does.
std::shared_ptr<const SamlToken> VerifyToken(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                                             const VerifyOptions &options);

/// Checks again, with the tolerance of `options`, a token that the library has accepted with
/// `DEFAULT_CLOCK_TOLERANCE_SEC`; does nothing unless the tolerance is less.
/// @param sink receives the text of a token that is refused
/// @throws ParseException
void RequireWithinTolerance(const SamlToken &token, const Tarvel::Crypto::CertificateList &trusted,
                            const VerifyOptions &options, const ServiceOptions::RefusedTokenSink &sink);

} // namespace SsoClient::Tool
