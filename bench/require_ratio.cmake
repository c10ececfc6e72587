# SPDX-License-Identifier: Apache-2.0
# Fails unless the JSON in FILE, which scripts/bench has written, has a ratio of the benchmark NAME:
# cmake -D FILE=… -D NAME=… -P.
file(READ "${FILE}" figures)
string(JSON ratio GET "${figures}" "${NAME}" ratio)
if(NOT ratio GREATER 0)
  message(FATAL_ERROR "${FILE}: the ratio of ${NAME} is ${ratio}")
endif()
