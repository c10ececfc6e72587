// SPDX-License-Identifier: Apache-2.0
/// @file
/// The environment that is in force, for the platform's own use.

#pragma once

#include <tarvel/core/environment.h>

namespace Tarvel {

/// The innermost `ScopedEnvironment`'s, or null without one. It lives as long as that scope.
const Environment *CurrentEnvironment() noexcept;

} // namespace Tarvel
