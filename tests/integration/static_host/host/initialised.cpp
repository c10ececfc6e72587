// SPDX-License-Identifier: Apache-2.0
// Sets a variable by a call before main, which no file of the libraries may do.
#include <unistd.h>

extern const pid_t INITIALISED_BEFORE_MAIN;
const pid_t INITIALISED_BEFORE_MAIN = ::getpid();
