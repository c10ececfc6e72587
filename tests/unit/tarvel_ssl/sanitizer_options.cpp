// SPDX-License-Identifier: Apache-2.0
// One test ends its process while its server has threads that are not joined. ThreadSanitizer would report those that have
// ended.

extern "C" const char *ThreadSanitizerOptions() __asm__("__tsan_default_options");

extern "C" __attribute__((visibility("default"), used)) const char *ThreadSanitizerOptions() {
  return "report_thread_leaks=0";
}
