# SPDX-License-Identifier: Apache-2.0
# Fails unless the figures of the benchmark "client" in the JSON of FILE, which scripts/bench has written, are within their
# limits: cmake -D FILE=… -D LIMITS=sizes -P, or LIMITS=times. Sizes (memory and threads) do not depend on the machine's speed,
# so they have their real limits. Times depend on it: in a short run on a busy machine, their limits only show that nothing is
# wrong by a large factor.
file(READ "${FILE}" figures)

# limit(BOUND PATH…): the figure at the path must be at most BOUND.
function(limit bound)
  string(JSON figure GET "${figures}" client ${ARGN})
  if(NOT figure LESS_EQUAL bound)
    message(FATAL_ERROR "${FILE}: ${ARGN} is ${figure}, and may be at most ${bound}")
  endif()
endfunction()

if(LIMITS STREQUAL sizes)
  limit(24 under_way http kb_each)
  limit(64 under_way tls kb_each)
  limit(8 under_way http threads)
  limit(8 under_way tls threads)
elseif(LIMITS STREQUAL times)
  limit(4 fresh_get threads_1 ratio)
  limit(4 fresh_get threads_16 ratio)
  limit(50 end cancel_one median_ms)
  limit(50 end cancel_among_many median_ms)
  limit(50 end deadline median_ms)
  limit(2 ratio) # the time of many acquisitions at once, compared with libcurl; the limit of a full run is 1 / 0.9
else()
  message(FATAL_ERROR "LIMITS must be sizes or times")
endif()
