// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where a token that the service has issued is written.

#pragma once

#include "output.h"
#include "service_call.h"

#include <ssoclient/service_dialect.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct TokenOutputOptions {
  std::string file;        ///< "-" is standard output; empty: the token is only shown
  std::string refusedFile; ///< for a token that the tool refuses; empty: it is discarded
  bool replace = false;
};

void AddTokenOutputOptions(CLI::App &app, TokenOutputOptions &options);

/// Checks, before the service is asked for a token, that the token can be written.
/// @throws UsageException, Tarvel::IOException
void CheckTokenOutput(const TokenOutputOptions &options, const OutputOptions &output);

/// If the token was issued for this command, warns of everything that `spec` asks for and the token does not have. With
/// a file, writes the token's XML to it, and then, unless the format is XML, the report to standard output. If the file
/// is "-", writes only the XML to standard output; without a file, only the report.
/// @param dialect of the request
/// @param toleranceSec see `FindUnmet`
/// @throws Tarvel::IOException when the XML cannot be written, or, without a file, the report.
void WriteToken(const IssuedToken &issued, const TokenSpec &spec, const ServiceDialect &dialect,
                std::int64_t toleranceSec, const TokenOutputOptions &options, const OutputOptions &output);

} // namespace SsoClient::Tool
