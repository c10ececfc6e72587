// SPDX-License-Identifier: Apache-2.0
/// @file
/// Whether this is a build under AddressSanitizer or ThreadSanitizer.

#pragma once

// g++ and clang show in different ways whether a sanitizer is on.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define TESTING_IS_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define TESTING_IS_SANITIZED 1
#endif
#endif

namespace Testing {

/// Under a sanitizer everything takes many times as long.
#ifdef TESTING_IS_SANITIZED
constexpr bool IS_SANITIZED = true;
#else
constexpr bool IS_SANITIZED = false;
#endif

} // namespace Testing
