// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exception that is being handled: its class as text, and the log line for an exception that is not rethrown.

#pragma once

#include "operation/secret_mask.h"

#include <string>
#include <typeinfo>

namespace SsoClient {

/// The class of the exception that is being handled; null if it is not an exception of C++.
const std::type_info *CurrentExceptionClass() noexcept;

/// The name of a class without its namespaces, such as "SsoException"; "unknown" for null.
std::string ClassNameOf(const std::type_info *type);

/// Writes that `subject`, such as "The observer's OnFault", threw the exception that is being handled. The line
/// contains no secret of `mask`.
/// @param id the operation's identifier, which begins the line; may be empty
void LogCaughtException(const std::string &id, const char *subject, const SecretMask &mask) noexcept;

} // namespace SsoClient
