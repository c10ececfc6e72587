// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Required`, the object of a pointer that must not be null.

#pragma once

#include <tarvel/core/exception.h>

#include <memory>

namespace SsoClient {

/// @throws Tarvel::InvalidArgumentException unless `exists`.
inline void CheckRequired(bool exists) {
  if (!exists) {
    throw Tarvel::InvalidArgumentException("a required object may not be NULL");
  }
}

/// The object of `pointer`.
/// @throws Tarvel::InvalidArgumentException when there is none.
template <typename T>
T &Required(const std::shared_ptr<T> &pointer) {
  CheckRequired(pointer != nullptr);
  return *pointer;
}

} // namespace SsoClient
