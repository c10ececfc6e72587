// SPDX-License-Identifier: Apache-2.0
// The standard library is compiled without ThreadSanitizer, which therefore does not see how that library counts the
// owners of an exception, and would report the destruction of each exception that two threads have owned.

extern "C" const char *ThreadSanitizerSuppressions() __asm__("__tsan_default_suppressions");

extern "C" __attribute__((visibility("default"), used)) const char *ThreadSanitizerSuppressions() {
  return "race:std::__exception_ptr::exception_ptr::_M_release\n"
         "race:std::logic_error::~logic_error\n";
}
