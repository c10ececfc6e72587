// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options that choose and change the dialect of the service.

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
  std::string appliesTo;             ///< empty: the dialect's value
  bool addressing = false;           ///< false: the dialect's value
};

void AddDialectOptions(CLI::App &app, DialectOptions &options);

/// The dialect of that name, or the dialect in that file. The name of a dialect is never read as a file.
/// @throws UsageException for a text that is neither, and does not look like a path. The message lists the names.
/// @throws Tarvel::IOException like `ReadDialectFile`.
ServiceDialect LoadDialect(const std::string &nameOrFile);

/// The dialect, changed by the switches.
/// @throws UsageException for a switch that is unknown, has no such value, or is given two values.
/// @throws Tarvel::InvalidArgumentException for a dialect that `CheckServiceDialect` refuses. Also throws what
///         `LoadDialect` throws.
ServiceDialect ToDialect(const DialectOptions &options);

/// @throws UsageException when the command line asks for what the dialect never writes.
void CheckSpecFits(const TokenSpec &spec, const ServiceDialect &dialect);

} // namespace SsoClient::Tool
