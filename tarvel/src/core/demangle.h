// SPDX-License-Identifier: Apache-2.0
/// @file
/// The readable form of a compiler's type name.

#pragma once

#include <string>

namespace Tarvel {

/// The readable name of the type whose `std::type_info::name` is `name`; `name` itself when it is not a type's name.
std::string Demangle(const char *name);

} // namespace Tarvel
