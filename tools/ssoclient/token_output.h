// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where a token that the service issued goes.

#pragma once

#include "output.h"
#include "service_call.h"

#include <ssoclient/token_spec.h>

#include <cstdint>
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

/// Warns of what `spec` asks for and the token does not have. Puts the token's XML where the options say, and shows on
/// standard output what the token says, unless that would be, or is already, the XML itself.
/// @param toleranceSec as for `FindUnmet`
/// @throws Tarvel::IOException when the XML cannot be written.
void WriteToken(const IssuedToken &issued, const TokenSpec &spec, std::int64_t toleranceSec,
                const TokenOutputOptions &options, const OutputOptions &output);

} // namespace SsoClient::Tool
