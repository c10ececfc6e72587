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

/// The dialect in the JSON file `path`. The file contains an object with the names of switches as keys. A switch that
/// is left out has the value of the dialect that the key "base" names, or of the default dialect if there is no such
/// key.
/// @throws Tarvel::IOException for a file that cannot be read, is not a regular file, is too large, or does not contain
///         a dialect. The message has the path and, if the problem is about a key, that key.
ServiceDialect ReadDialectFile(const std::string &path);

/// The dialect as text that `ReadDialectFile` reads, with every switch.
std::string WriteDialect(const ServiceDialect &dialect);

} // namespace SsoClient::Tool
