// SPDX-License-Identifier: Apache-2.0
// Calls a function before main to set a variable. No file of the libraries may do this.
#include <unistd.h>

extern const pid_t INITIALISED_BEFORE_MAIN;
const pid_t INITIALISED_BEFORE_MAIN = ::getpid();
