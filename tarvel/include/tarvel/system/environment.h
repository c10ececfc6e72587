// SPDX-License-Identifier: Apache-2.0
/// @file
/// The former place of `Environment` and `ScopedEnvironment`, kept for programs that include it.

#pragma once

#include <tarvel/core/environment.h>

namespace Tarvel::System {

using Tarvel::Environment;
using Tarvel::ScopedEnvironment;

} // namespace Tarvel::System
