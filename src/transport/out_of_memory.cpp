// SPDX-License-Identifier: Apache-2.0
#include "transport/out_of_memory.h"

namespace SsoClient {

const Tarvel::OutOfMemoryException &OutOfMemory() {
  static const auto *const exception = new Tarvel::OutOfMemoryException("Out of memory");
  return *exception;
}

} // namespace SsoClient
