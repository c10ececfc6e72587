// SPDX-License-Identifier: Apache-2.0
/// @file
/// `getLogger`, the library's logger.

#pragma once

#include <ssoclient/export.h>
#include <tarvel/service/logger.h>

namespace SsoClient {

/// Level of operation frames and of request and result lines. The logger lets it through from the start.
constexpr int LOG_LEVEL_OPERATION = 64;

/// Level of the warning that a negotiation handler broke its contract.
constexpr int LOG_LEVEL_CONTRACT_WARNING = 8;

/// The library's logger, named "SsoClient" and of level 64 at first, made on first use. It lives until the process
/// ends. Safe on any thread. Nothing is printed until the host installs a sink at
/// `Tarvel::Service::GetApp().GetRootLogger()`.
SSOCLIENT_API Tarvel::Service::Logger &getLogger();

} // namespace SsoClient
