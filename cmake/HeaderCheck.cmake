# SPDX-License-Identifier: Apache-2.0
# The target `header_check`: each public header compiled alone, as C++17 and as C++20, with all our warnings.

file(GLOB_RECURSE public_headers CONFIGURE_DEPENDS
  ${PROJECT_SOURCE_DIR}/include/*.h ${PROJECT_SOURCE_DIR}/tarvel/include/*.h
  ${PROJECT_SOURCE_DIR}/gssapi/include/*.h)
set(header_check_sources)
foreach(header IN LISTS public_headers)
  string(REGEX REPLACE "^.*/include/" "" name ${header})
  string(MAKE_C_IDENTIFIER ${name} unit)
  set(source ${PROJECT_BINARY_DIR}/header_check/${unit}.cpp)
  file(CONFIGURE OUTPUT ${source} CONTENT "#include <@name@>\n" @ONLY)
  list(APPEND header_check_sources ${source})
endforeach()

add_custom_target(header_check)
foreach(standard 17 20)
  add_library(header_check_${standard} OBJECT EXCLUDE_FROM_ALL ${header_check_sources})
  target_include_directories(header_check_${standard} PRIVATE
    ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR}/tarvel/include ${PROJECT_SOURCE_DIR}/gssapi/include)
  target_link_libraries(header_check_${standard} PRIVATE Boost::headers ssoclient_options)
  set_target_properties(header_check_${standard} PROPERTIES CXX_STANDARD ${standard})
  add_dependencies(header_check header_check_${standard})
endforeach()
