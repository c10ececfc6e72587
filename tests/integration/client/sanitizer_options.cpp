// SPDX-License-Identifier: Apache-2.0
// ThreadSanitizer does not see how the standard library counts the owners of an exception, because that library is compiled
// without it. So it would report the destruction of each exception that two threads have owned.

extern "C" const char *ThreadSanitizerSuppressions() __asm__("__tsan_default_suppressions");

extern "C" __attribute__((visibility("default"), used)) const char *ThreadSanitizerSuppressions() {
  return "race:std::__exception_ptr::exception_ptr::_M_release\n"
         "race:std::logic_error::~logic_error\n";
}
