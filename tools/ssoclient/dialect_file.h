// SPDX-License-Identifier: Apache-2.0
/// @file
/// Dialects in JSON files.

#pragma once

#include <ssoclient/service_dialect.h>

#include <cstddef>
#include <string>

namespace SsoClient::Tool {

/// The largest file that is read as a dialect.
constexpr std::size_t MAX_DIALECT_BYTES = 64u * 1024;

/// The dialect in the JSON file `path`: an object whose keys are "base", the name of a dialect from which this one
/// differs, and the names of switches. Without a key "base", the base is the default dialect.
/// @throws Tarvel::IOException for a file that cannot be read, is not a regular file, is too large, or does not contain
///         a dialect. The message has the path and, if the problem is about one, the key.
ServiceDialect ReadDialectFile(const std::string &path);

/// The dialect as text that `ReadDialectFile` reads, with every switch.
std::string WriteDialect(const ServiceDialect &dialect);

} // namespace SsoClient::Tool
