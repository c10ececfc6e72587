// SPDX-License-Identifier: Apache-2.0
/// @file
/// The environment that is in force, for the platform's own use.

#pragma once

#include <tarvel/system/environment.h>

namespace Tarvel::System {

/// The innermost `ScopedEnvironment`'s, or null when there is none. It lives as long as that scope.
const Environment *CurrentEnvironment() noexcept;

} // namespace Tarvel::System
