# SPDX-License-Identifier: Apache-2.0
# Targets that compile the public headers with all our warnings, as C++17 and as C++20: header_check_17 and header_check_20
# compile each header alone; header_check_together_17 and header_check_together_20 compile all headers in one source.
# header_check is all four.

file(GLOB_RECURSE public_headers CONFIGURE_DEPENDS
  ${PROJECT_SOURCE_DIR}/include/*.h ${PROJECT_SOURCE_DIR}/tarvel/include/*.h
  ${PROJECT_SOURCE_DIR}/gssapi/include/*.h ${PROJECT_SOURCE_DIR}/asio/include/*.h)
set(header_check_sources)
set(header_check_includes "")
foreach(header IN LISTS public_headers)
  string(REGEX REPLACE "^.*/include/" "" name ${header})
  string(MAKE_C_IDENTIFIER ${name} unit)
  set(source ${PROJECT_BINARY_DIR}/header_check/${unit}.cpp)
  file(CONFIGURE OUTPUT ${source} CONTENT "#include <@name@>\n" @ONLY)
  list(APPEND header_check_sources ${source})
  string(APPEND header_check_includes "#include <${name}>\n")
endforeach()
set(header_check_together ${PROJECT_BINARY_DIR}/header_check/together.cpp)
file(CONFIGURE OUTPUT ${header_check_together} CONTENT "@header_check_includes@" @ONLY)

function(ssoclient_add_header_check target standard)
  add_library(${target} OBJECT EXCLUDE_FROM_ALL ${ARGN})
  target_include_directories(${target} PRIVATE
    ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR}/tarvel/include ${PROJECT_SOURCE_DIR}/gssapi/include
    ${PROJECT_SOURCE_DIR}/asio/include)
  target_link_libraries(${target} PRIVATE Boost::headers ssoclient_options)
  set_target_properties(${target} PROPERTIES CXX_STANDARD ${standard})
  add_dependencies(header_check ${target})
endfunction()

add_custom_target(header_check)
foreach(standard 17 20)
  ssoclient_add_header_check(header_check_${standard} ${standard} ${header_check_sources})
  ssoclient_add_header_check(header_check_together_${standard} ${standard} ${header_check_together})
endforeach()
