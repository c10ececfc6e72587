// SPDX-License-Identifier: Apache-2.0
// A test ends its process while a server of its own has threads that nobody has joined yet; some of them are over by then.
// ThreadSanitizer would report these.

extern "C" const char *ThreadSanitizerOptions() __asm__("__tsan_default_options");

extern "C" __attribute__((visibility("default"), used)) const char *ThreadSanitizerOptions() {
  return "report_thread_leaks=0";
}
