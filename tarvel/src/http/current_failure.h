// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exception that is being handled, in a form that completions can be given.

#pragma once

#include <tarvel/core/exception.h>

#include <memory>
#include <string>

namespace Tarvel::Http {

/// The exception for memory that ran out. It is made at the first call, so that later calls need no memory.
const std::shared_ptr<const Exception> &OutOfMemory();

/// To be called while an exception is being handled. A `Tarvel::Exception` is returned in its own class. For
/// `std::bad_alloc`, and for an exception that cannot be copied for lack of memory, `OutOfMemory()` is returned, which
/// must have been called before. Anything else becomes an InvalidStateException about the request to `endpoint`, with
/// the foreign text.
std::shared_ptr<const Exception> CurrentFailure(const std::string &endpoint) noexcept;

} // namespace Tarvel::Http
