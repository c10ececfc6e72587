// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CheckedCast`, a downcast of a counted reference that throws when the class is wrong.

#pragma once

#include <tarvel/core/ref.h>

#include <typeinfo>

namespace Tarvel {

/// The same object as a `T`; null stays null.
/// @throws TypeMismatchException when the object is not a `T`.
template <typename T>
Ref<T> CheckedCast(const Ref<Object> &object) {
  if (!object) {
    return nullptr;
  }
  T *const cast = dynamic_cast<T *>(object.get());
  if (!cast) {
    const Object &actual = *object;
    ThrowTypeMismatch(typeid(T).name(), typeid(actual).name());
  }
  return Ref<T>(cast);
}

} // namespace Tarvel
