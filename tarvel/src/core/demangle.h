// SPDX-License-Identifier: Apache-2.0
/// @file
/// The readable form of a compiler's type name.

#pragma once

#include <string>

namespace Tarvel {

/// The type that `name`, as `std::type_info::name` gives it, stands for; `name` itself when it is no such name.
std::string Demangle(const char *name);

} // namespace Tarvel
