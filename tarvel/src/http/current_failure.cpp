// SPDX-License-Identifier: Apache-2.0

#include "http/current_failure.h"

#include "core/fork_gate.h"

#include <new>

namespace Tarvel::Http {

namespace {

std::shared_ptr<const Exception> MakeForeignFailure(const std::string &endpoint, const char *text) {
  return std::make_shared<InvalidStateException>("The request to " + endpoint + " failed: " + text);
}

/// Throws when memory runs out.
std::shared_ptr<const Exception> CopyCurrentFailure(const std::string &endpoint) {
  try {
    throw;
  } catch (const Exception &exception) {
    return std::shared_ptr<const Exception>(exception.Clone());
  } catch (const std::bad_alloc &) {
    return OutOfMemory();
  } catch (const std::exception &exception) {
    return MakeForeignFailure(endpoint, exception.what());
  } catch (...) {
    return MakeForeignFailure(endpoint, "an object that is not an exception was thrown");
  }
}

} // namespace

const std::shared_ptr<const Exception> &OutOfMemory() {
  const Computation computing;
  // Never destroyed, because the threads that use it run until the process ends.
  static const auto *const failure = new std::shared_ptr<const Exception>(std::make_shared<OutOfMemoryException>());
  return *failure;
}

std::shared_ptr<const Exception> CurrentFailure(const std::string &endpoint) noexcept {
  try {
    return CopyCurrentFailure(endpoint);
  } catch (...) {
    return OutOfMemory();
  }
}

} // namespace Tarvel::Http
