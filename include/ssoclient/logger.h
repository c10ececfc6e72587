// SPDX-License-Identifier: Apache-2.0
/// @file
/// `getLogger`, the library's logger.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/service/logger.h>

namespace SsoClient {

/// The level of lines about the start, the requests, the result and the end of operations. The logger's initial level.
constexpr int LOG_LEVEL_OPERATION = 64;

/// The level of warnings: about the leg that a negotiation handler returned for the service's final leg, and about an
/// observer, a sink of refused tokens, a callback, an executor or a function of `CancelToken::OnCancel` that threw an
/// exception, and about a token that could not be written to a file cache or removed from it.
constexpr int LOG_LEVEL_CONTRACT_WARNING = 8;

/// The library's logger. Its name is "SsoClient", and its level is 64 until the host sets another. It is made on first
/// use and lives until the process ends. Any thread may use it. Nothing is printed until the host installs a sink at
/// `Tarvel::Service::GetApp().GetRootLogger()`.
SSOCLIENT_API Tarvel::Service::Logger &getLogger();

} // namespace SsoClient
