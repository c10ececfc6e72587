// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RemoveFromCache`, which removes an invalidated token from the file cache.

#pragma once

#include "client/refresh_attempt.h"

#include <memory>
#include <string>

namespace SsoClient {

/// Removes the token with this identifier from the file soon, when the file can be locked. A failure is logged. Returns at once.
void RemoveFromCache(const std::shared_ptr<const RefreshSupplies> &supplies, const std::string &tokenId) noexcept;

} // namespace SsoClient
