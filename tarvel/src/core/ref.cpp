// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/ref.h>

#include "core/demangle.h"

#include <tarvel/core/exception.h>

namespace Tarvel {

Object::~Object() = default;

void ThrowTypeMismatch(const char *expected, const char *actual) {
  throw TypeMismatchException("Type mismatch : expected " + Demangle(expected) + ", but the object is " +
                              Demangle(actual));
}

} // namespace Tarvel
