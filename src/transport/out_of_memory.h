// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OutOfMemory`, for completions that must be called when memory has run out.

#pragma once

#include <tarvel/core/exception.h>

namespace SsoClient {

/// The one exception that says so. Made at the first call, which must come before it is needed; never destroyed.
const Tarvel::OutOfMemoryException &OutOfMemory();

} // namespace SsoClient
