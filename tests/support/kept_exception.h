// SPDX-License-Identifier: Apache-2.0
/// @file
/// Keeps exceptions that two threads have owned, in builds with ThreadSanitizer.

#pragma once

#include <cstddef>
#include <deque>
#include <exception>
#include <mutex>

#if defined(__has_feature)
#if __has_feature(thread_sanitizer)
#define TESTING_KEEPS_EXCEPTIONS 1
#endif
#endif
#ifdef __SANITIZE_THREAD__
#define TESTING_KEEPS_EXCEPTIONS 1
#endif

namespace Testing {

/// Keeps `exception`, if ThreadSanitizer is on, until a thousand later ones have been kept: the standard library is
/// compiled without ThreadSanitizer, which therefore does not see how that library counts the owners of an exception, and
/// would report its destruction as a race. Here, a mutex orders the destruction after the use.
inline void KeepForThreadSanitizer([[maybe_unused]] const std::exception_ptr &exception) {
#ifdef TESTING_KEEPS_EXCEPTIONS
  static std::mutex *const mutex = new std::mutex;
  static std::deque<std::exception_ptr> *const kept = new std::deque<std::exception_ptr>;
  constexpr std::size_t COUNT = 1'000;
  const std::lock_guard<std::mutex> lock(*mutex);
  kept->push_back(exception);
  if (kept->size() > COUNT) {
    kept->pop_front();
  }
#endif
}

} // namespace Testing
