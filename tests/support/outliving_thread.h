// SPDX-License-Identifier: Apache-2.0
/// @file
/// Threads that end after OpenSSL has cleaned itself up. The memory that OpenSSL keeps for such a thread is never
/// freed: OpenSSL has deleted the key by which the thread would find it when it ends.

#pragma once

#if defined(__has_feature)
#if __has_feature(address_sanitizer)
#include <sanitizer/lsan_interface.h>
#define TESTING_FINDS_LEAKS 1
#endif
#endif

namespace Testing {

/// Must be the first call on such a thread: memory that is allocated there is not reported as a leak.
inline void BeginOutlivingThread() {
#ifdef TESTING_FINDS_LEAKS
  __lsan_disable();
#endif
}

} // namespace Testing
