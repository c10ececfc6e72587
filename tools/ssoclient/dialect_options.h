// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options that say how the service wants to be asked.

#pragma once

#include <ssoclient/service_dialect.h>
#include <ssoclient/token_spec.h>

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct DialectOptions {
  std::string dialect;               ///< a name or a file; empty: the default dialect
  std::vector<std::string> switches; ///< each of the form NAME=VALUE
  std::string appliesTo;             ///< empty: as the dialect says
  bool addressing = false;           ///< false: as the dialect says
};

void AddDialectOptions(CLI::App &app, DialectOptions &options);

/// The dialect of that name, or that is in the file. A name that the library knows is never read as a file.
/// @throws UsageException for a text that is neither, and does not look like a path: the message lists the names.
/// @throws Tarvel::IOException as `ReadDialectFile`.
ServiceDialect LoadDialect(const std::string &nameOrFile);

/// The dialect, changed by the switches.
/// @throws UsageException for a switch that is unknown, has no such value, or is given two values.
/// @throws Tarvel::InvalidArgumentException for a dialect that `CheckServiceDialect` refuses. Also throws what
///         `LoadDialect` throws.
ServiceDialect ToDialect(const DialectOptions &options);

/// @throws UsageException when the command line asks for what the dialect never writes.
void CheckSpecFits(const TokenSpec &spec, const ServiceDialect &dialect);

} // namespace SsoClient::Tool
