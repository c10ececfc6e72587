// SPDX-License-Identifier: Apache-2.0
/// @file
/// The classes of the exceptions with which a token may be refused.

#pragma once

#include <exception>
#include <string>

namespace Testing {

/// The unqualified name of the class of `failure`; "undocumented" for a class that verification does not document. The
/// exact class counts: a class derived from a documented one would be unexpected, too.
std::string ClassOf(const std::exception &failure);

} // namespace Testing
