// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where a token that the service issued goes.

#pragma once

#include "output.h"

#include <ssoclient/saml_token.h>

#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct TokenOutputOptions {
  std::string file; ///< "-" is standard output; empty: the token is shown, and kept nowhere
  bool replace = false;
};

void AddTokenOutputOptions(CLI::App &app, TokenOutputOptions &options);

/// Refuses, before the service is asked for a token, a place where the token could not be put.
/// @throws UsageException, Tarvel::IOException
void CheckTokenOutput(const TokenOutputOptions &options, const OutputOptions &output);

/// Puts the token's XML where the options say, and tells on standard output what the token says, unless that would be, or is
/// already, the XML itself.
/// @throws Tarvel::IOException
void WriteToken(const SamlToken &token, const TokenOutputOptions &options, const OutputOptions &output);

} // namespace SsoClient::Tool
