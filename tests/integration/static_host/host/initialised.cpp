// SPDX-License-Identifier: Apache-2.0
// What no file of the libraries may do: set a variable by a call before main.
#include <unistd.h>

extern const pid_t INITIALISED_BEFORE_MAIN;
const pid_t INITIALISED_BEFORE_MAIN = ::getpid();
