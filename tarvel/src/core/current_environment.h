// SPDX-License-Identifier: Apache-2.0
/// @file
/// The environment that applies now, for the platform's own use.

#pragma once

#include <tarvel/core/environment.h>

namespace Tarvel {

/// The environment of the innermost `ScopedEnvironment`; null when there is no such scope. It is valid until that scope
/// ends.
const Environment *CurrentEnvironment() noexcept;

} // namespace Tarvel
