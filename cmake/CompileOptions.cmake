# SPDX-License-Identifier: Apache-2.0
# How our own code is compiled. Warnings are errors in our builds; a packager who meets a newer compiler turns that off.

option(SSOCLIENT_WERROR "Treat warnings as errors" ${PROJECT_IS_TOP_LEVEL})

add_library(ssoclient_options INTERFACE)
target_compile_options(ssoclient_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wnon-virtual-dtor -Woverloaded-virtual
  -Wcast-qual -Wformat=2 -Wimplicit-fallthrough -Wundef
  $<$<BOOL:${SSOCLIENT_WERROR}>:-Werror>)
# g++ 12 sees overlapping copies in optimised string concatenation where there are none (GCC bug 105651).
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  target_compile_options(ssoclient_options INTERFACE -Wno-restrict)
endif()
# In the half gigabyte that it may fill first, g++ finds nothing worth collecting: our sources take less.
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND PROJECT_IS_TOP_LEVEL)
  target_compile_options(ssoclient_options INTERFACE --param=ggc-min-heapsize=524288)
endif()
# Names that are reserved for the compiler and the standard library: clang finds them in passing, clang-tidy's check for
# them is a sixth of its time. It also finds comments that name a parameter which does not exist.
if(CMAKE_CXX_COMPILER_ID MATCHES "Clang")
  target_compile_options(ssoclient_options INTERFACE -Wreserved-identifier -Wdocumentation)
endif()
if(NOT CMAKE_BUILD_TYPE STREQUAL "Debug" AND NOT SSOCLIENT_SANITIZERS)
  target_compile_definitions(ssoclient_options INTERFACE _FORTIFY_SOURCE=2)
endif()
target_compile_options(ssoclient_options INTERFACE -fstack-protector-strong)
# Most of what a verification calls is in another library: through its address it is a thirtieth faster than through a stub
# that finds the address at the first call.
target_compile_options(ssoclient_options INTERFACE -fno-plt)
# Asio gives its symbols default visibility otherwise, and a host's Asio, of another version, would take their place.
target_compile_definitions(ssoclient_options INTERFACE BOOST_ASIO_DISABLE_VISIBILITY)

if(SSOCLIENT_SANITIZERS)
  list(JOIN SSOCLIENT_SANITIZERS "," sanitizers)
  add_compile_options(-fsanitize=${sanitizers} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${sanitizers})
  # What the sanitizers add to std::regex looks to g++ like use before initialisation; its manual warns of that.
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    target_compile_options(ssoclient_options INTERFACE -Wno-maybe-uninitialized)
  endif()
endif()

if(SSOCLIENT_FUZZ_ENGINE AND NOT CMAKE_CXX_COMPILER_ID MATCHES "Clang")
  message(FATAL_ERROR "SSOCLIENT_FUZZ_ENGINE needs clang")
endif()
# The fuzzing engine steers by the coverage of the libraries' code, not only by that of the fuzz targets.
function(ssoclient_guide_fuzzing target)
  if(SSOCLIENT_FUZZ_ENGINE)
    target_compile_options(${target} PRIVATE -fsanitize=fuzzer-no-link)
  endif()
endfunction()

# Programs that are linked often and shipped never are linked by the fastest linker there is.
option(SSOCLIENT_FAST_LINKER "Link tests and fuzz targets by mold when it is installed" ${PROJECT_IS_TOP_LEVEL})
if(SSOCLIENT_FAST_LINKER)
  find_program(SSOCLIENT_MOLD mold)
  mark_as_advanced(SSOCLIENT_MOLD)
endif()
function(ssoclient_link_fast target)
  if(SSOCLIENT_FAST_LINKER AND SSOCLIENT_MOLD)
    target_link_options(${target} INTERFACE -fuse-ld=mold)
  endif()
endfunction()

# Threads of the library outlive each use of it: a program that closes a plug-in which uses it must not pull the code away
# from under them.
function(ssoclient_keep_loaded target)
  if(BUILD_SHARED_LIBS)
    target_link_options(${target} PRIVATE LINKER:-z,nodelete)
  endif()
endfunction()
