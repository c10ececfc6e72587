// SPDX-License-Identifier: Apache-2.0

#include "core/demangle.h"

#include <boost/core/demangle.hpp>

namespace Tarvel {

std::string Demangle(const char *name) {
  return boost::core::demangle(name);
}

} // namespace Tarvel
