// SPDX-License-Identifier: Apache-2.0
// ThreadSanitizer ends a child that starts a thread, unless it is asked not to: these tests are about such children.

extern "C" const char *ThreadSanitizerOptions() __asm__("__tsan_default_options");

extern "C" __attribute__((visibility("default"), used)) const char *ThreadSanitizerOptions() {
  return "die_after_fork=0";
}
