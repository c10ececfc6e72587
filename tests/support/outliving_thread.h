// SPDX-License-Identifier: Apache-2.0
/// @file
/// Threads that end after OpenSSL has cleaned itself up. What OpenSSL keeps for such a thread, nobody frees any more: it
/// gives up the key under which a thread would find it when it ends.

#pragma once

#if defined(__has_feature)
#if __has_feature(address_sanitizer)
#include <sanitizer/lsan_interface.h>
#define TESTING_FINDS_LEAKS 1
#endif
#endif

namespace Testing {

/// Called first of all on such a thread: what is allocated there is not reported as a leak.
inline void BeginOutlivingThread() {
#ifdef TESTING_FINDS_LEAKS
  __lsan_disable();
#endif
}

} // namespace Testing
