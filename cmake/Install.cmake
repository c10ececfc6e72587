# SPDX-License-Identifier: Apache-2.0
# What `cmake --install` installs, and where: both libraries, their public headers, the CMake package and the pkg-config files.
# Components: "runtime" (what a program needs to run), "development" (what it needs to be built, and the documentation),
# "tools"; "gssapi" and "gssapi-development" for the negotiation handler.

include(CMakePackageConfigHelpers)

install(TARGETS tarvel ssoclient EXPORT ssoclient-targets
  RUNTIME COMPONENT runtime
  LIBRARY COMPONENT runtime NAMELINK_COMPONENT development
  ARCHIVE COMPONENT development
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(DIRECTORY include/ tarvel/include/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development
  FILES_MATCHING PATTERN "*.h")

set(ssoclient_package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/ssoclient)
install(EXPORT ssoclient-targets NAMESPACE ssoclient:: DESTINATION ${ssoclient_package_dir} COMPONENT development)
configure_package_config_file(cmake/ssoclient-config.cmake.in ${PROJECT_BINARY_DIR}/ssoclient-config.cmake
  INSTALL_DESTINATION ${ssoclient_package_dir})
# Before 1.0 a minor release may change the interface, so a project that requests 0.1 gets only 0.1.
write_basic_package_version_file(${PROJECT_BINARY_DIR}/ssoclient-config-version.cmake COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/ssoclient-config.cmake ${PROJECT_BINARY_DIR}/ssoclient-config-version.cmake
  DESTINATION ${ssoclient_package_dir} COMPONENT development)

# The prefix in a pkg-config file is relative to the file, so that an installed tree can be moved.
file(RELATIVE_PATH ssoclient_pc_to_prefix
  ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
string(REGEX REPLACE "/$" "" ssoclient_pc_to_prefix "${ssoclient_pc_to_prefix}")
# A program links static libraries together with the libraries that these need; shared libraries list theirs themselves.
set(ssoclient_pc_requires "")
if(NOT BUILD_SHARED_LIBS)
  set(ssoclient_pc_requires "Requires: openssl >= 3.0")
endif()
foreach(name tarvel ssoclient)
  configure_file(cmake/${name}.pc.in ${PROJECT_BINARY_DIR}/${name}.pc @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/${name}.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT development)
endforeach()

# The functions for Boost.Asio are headers, which belong to the development files. Their target is separate, so that a program
# requests what it uses.
install(TARGETS ssoclient_asio EXPORT ssoclient-asio-targets
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(DIRECTORY asio/include/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development
  FILES_MATCHING PATTERN "*.h")
install(EXPORT ssoclient-asio-targets NAMESPACE ssoclient:: DESTINATION ${ssoclient_package_dir} COMPONENT development)
configure_file(cmake/ssoclient-asio.pc.in ${PROJECT_BINARY_DIR}/ssoclient-asio.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/ssoclient-asio.pc
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT development)

# The handler over the GSSAPI is a separate option and component, so that the rest needs no Kerberos.
if(TARGET ssoclient_gssapi)
  install(TARGETS ssoclient_gssapi EXPORT ssoclient-gssapi-targets
    RUNTIME COMPONENT gssapi
    LIBRARY COMPONENT gssapi NAMELINK_COMPONENT gssapi-development
    ARCHIVE COMPONENT gssapi-development
    INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
  install(DIRECTORY gssapi/include/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT gssapi-development
    FILES_MATCHING PATTERN "*.h")
  install(EXPORT ssoclient-gssapi-targets NAMESPACE ssoclient::
    DESTINATION ${ssoclient_package_dir} COMPONENT gssapi-development)
  set(ssoclient_pc_gssapi_requires "")
  if(NOT BUILD_SHARED_LIBS)
    set(ssoclient_pc_gssapi_requires ", krb5-gssapi >= 1.16, krb5")
  endif()
  configure_file(cmake/ssoclient-gssapi.pc.in ${PROJECT_BINARY_DIR}/ssoclient-gssapi.pc @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/ssoclient-gssapi.pc
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT gssapi-development)
endif()

install(FILES docs/man/ssoclient.1 DESTINATION ${CMAKE_INSTALL_MANDIR}/man1 COMPONENT tools)
install(FILES LICENSE CHANGELOG.md DESTINATION ${CMAKE_INSTALL_DOCDIR} COMPONENT runtime)
# The README and the files that it links to.
install(FILES README.md CONTRIBUTING.md SECURITY.md DESTINATION ${CMAKE_INSTALL_DOCDIR} COMPONENT development)
install(DIRECTORY docs examples DESTINATION ${CMAKE_INSTALL_DOCDIR} COMPONENT development)
