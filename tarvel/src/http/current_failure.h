// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exception that is being handled, in a form that can be passed to completions.

#pragma once

#include <tarvel/core/exception.h>

#include <memory>
#include <string>

namespace Tarvel::Http {

/// The exception for a lack of memory. It is made at the first call, so that later calls need no memory.
const std::shared_ptr<const Exception> &OutOfMemory();

/// Must be called while an exception is being handled. A `Tarvel::Exception` is copied with its own class. For
/// `std::bad_alloc`, and for an exception that cannot be copied for lack of memory, the result is that of
/// `OutOfMemory()`, which must have been called before. Anything else becomes an InvalidStateException about the
/// request to `endpoint`, with the text of what was thrown.
std::shared_ptr<const Exception> CurrentFailure(const std::string &endpoint) noexcept;

} // namespace Tarvel::Http
