# SPDX-License-Identifier: Apache-2.0
# How our own code is compiled. Warnings are errors in our builds; with a newer compiler, a packager can turn SSOCLIENT_WERROR
# off.

option(SSOCLIENT_WERROR "Treat warnings as errors" ${PROJECT_IS_TOP_LEVEL})

add_library(ssoclient_options INTERFACE)
target_compile_options(ssoclient_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wnon-virtual-dtor -Woverloaded-virtual
  -Wcast-qual -Wformat=2 -Wimplicit-fallthrough -Wundef
  $<$<BOOL:${SSOCLIENT_WERROR}>:-Werror>)
# g++ 12 wrongly reports overlapping copies in optimised string concatenation (GCC bug 105651).
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  target_compile_options(ssoclient_options INTERFACE -Wno-restrict)
endif()
# g++ collects garbage only above half a gigabyte. Our sources take less, so it never spends time on that.
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND PROJECT_IS_TOP_LEVEL)
  target_compile_options(ssoclient_options INTERFACE --param=ggc-min-heapsize=524288)
endif()
# clang finds names that are reserved for the compiler and the standard library at no cost; clang-tidy's check for them would
# take a sixth of its time. clang also finds comments about parameters that do not exist.
if(CMAKE_CXX_COMPILER_ID MATCHES "Clang")
  target_compile_options(ssoclient_options INTERFACE -Wreserved-identifier -Wdocumentation)
endif()
if(NOT CMAKE_BUILD_TYPE STREQUAL "Debug" AND NOT SSOCLIENT_SANITIZERS)
  target_compile_definitions(ssoclient_options INTERFACE _FORTIFY_SOURCE=2)
endif()
target_compile_options(ssoclient_options INTERFACE -fstack-protector-strong)
# Most functions that a verification calls are in another library. Direct calls to their addresses make it a thirtieth faster
# than calls through stubs that find the address at the first call.
target_compile_options(ssoclient_options INTERFACE -fno-plt)
# Otherwise Asio gives its symbols default visibility. If a host used another version of Asio, its symbols would replace ours.
target_compile_definitions(ssoclient_options INTERFACE BOOST_ASIO_DISABLE_VISIBILITY)

if(SSOCLIENT_SANITIZERS)
  list(JOIN SSOCLIENT_SANITIZERS "," sanitizers)
  add_compile_options(-fsanitize=${sanitizers} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${sanitizers})
  # With the sanitizers' instrumentation, g++ wrongly reports use before initialisation in std::regex; its
  # manual warns of such reports.
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    target_compile_options(ssoclient_options INTERFACE -Wno-maybe-uninitialized)
  endif()
endif()

if(SSOCLIENT_FUZZ_ENGINE AND NOT CMAKE_CXX_COMPILER_ID MATCHES "Clang")
  message(FATAL_ERROR "SSOCLIENT_FUZZ_ENGINE needs clang")
endif()
# The fuzzing engine is guided by the coverage of the libraries' code, not only by that of the fuzz targets.
function(ssoclient_guide_fuzzing target)
  if(SSOCLIENT_FUZZ_ENGINE)
    target_compile_options(${target} PRIVATE -fsanitize=fuzzer-no-link)
  endif()
endfunction()

# Programs that are linked often and never shipped are linked by the fastest linker.
option(SSOCLIENT_FAST_LINKER "Link tests and fuzz targets with mold when it is installed" ${PROJECT_IS_TOP_LEVEL})
if(SSOCLIENT_FAST_LINKER)
  find_program(SSOCLIENT_MOLD mold)
  mark_as_advanced(SSOCLIENT_MOLD)
endif()
function(ssoclient_link_fast target)
  if(SSOCLIENT_FAST_LINKER AND SSOCLIENT_MOLD)
    target_link_options(${target} INTERFACE -fuse-ld=mold)
  endif()
endfunction()

# The library's threads outlive each use of it. A program that closes a plug-in which uses the library must not unload the code
# that those threads run.
function(ssoclient_keep_loaded target)
  if(BUILD_SHARED_LIBS)
    target_link_options(${target} PRIVATE LINKER:-z,nodelete)
  endif()
endfunction()
