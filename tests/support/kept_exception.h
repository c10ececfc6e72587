// SPDX-License-Identifier: Apache-2.0
/// @file
/// Keeps exceptions that two threads have owned, in builds with ThreadSanitizer.

#pragma once

#include <exception>
#include <mutex>
#include <vector>

#if defined(__has_feature)
#if __has_feature(thread_sanitizer)
#define TESTING_KEEPS_EXCEPTIONS 1
#endif
#endif
#ifdef __SANITIZE_THREAD__
#define TESTING_KEEPS_EXCEPTIONS 1
#endif

namespace Testing {

/// Keeps `exception` until the process ends, if ThreadSanitizer is on: the standard library is compiled without it, so it
/// does not see how that library counts the owners of an exception, and would report its destruction as a race.
inline void KeepForThreadSanitizer([[maybe_unused]] const std::exception_ptr &exception) {
#ifdef TESTING_KEEPS_EXCEPTIONS
  static std::mutex *const mutex = new std::mutex;
  static std::vector<std::exception_ptr> *const kept = new std::vector<std::exception_ptr>;
  const std::lock_guard<std::mutex> lock(*mutex);
  kept->push_back(exception);
#endif
}

} // namespace Testing
