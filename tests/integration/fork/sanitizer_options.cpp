// SPDX-License-Identifier: Apache-2.0
// ThreadSanitizer ends a child that starts a thread, unless it is asked not to: these tests are about such children.

extern "C" const char *__tsan_default_options();

extern "C" const char *__tsan_default_options() {
  return "die_after_fork=0";
}
