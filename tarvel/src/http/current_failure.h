// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exception that is being handled, as one that a completion can be given.

#pragma once

#include <tarvel/core/exception.h>

#include <memory>
#include <string>

namespace Tarvel::Http {

/// The one exception that says that memory ran out. It is made at the first call, so that none is needed when it is.
const std::shared_ptr<const Exception> &OutOfMemory();

/// Called while an exception is being handled: a `Tarvel::Exception` as its own class; `std::bad_alloc`, and whatever
/// cannot be copied for lack of memory, as `OutOfMemory()`, which must have been called before; anything else as an
/// InvalidStateException about the request to `endpoint`, with the foreign text.
std::shared_ptr<const Exception> CurrentFailure(const std::string &endpoint) noexcept;

} // namespace Tarvel::Http
