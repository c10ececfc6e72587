# SPDX-License-Identifier: Apache-2.0
# `cpack` in a build with prefix /usr makes Debian packages: the libraries, their development files and the tool; and, when they are
# built, the development token service, and the negotiation handler over the GSSAPI with its development files. Needs dpkg-dev.

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME ssoclient)
set(CPACK_PACKAGE_VENDOR "The ssoclient developers")
set(CPACK_PACKAGE_CONTACT "The ssoclient developers <maintainers@localhost>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_RESOURCE_FILE_LICENSE ${PROJECT_SOURCE_DIR}/LICENSE)
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)

set(CPACK_COMPONENTS_ALL runtime development)
if(SSOCLIENT_BUILD_TOOLS)
  list(APPEND CPACK_COMPONENTS_ALL tools)
endif()
if(TARGET ssoclient_devsts)
  list(APPEND CPACK_COMPONENTS_ALL devsts)
endif()
if(TARGET ssoclient_gssapi)
  list(APPEND CPACK_COMPONENTS_ALL gssapi gssapi-development)
endif()
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS
  "${PROJECT_BINARY_DIR}/tarvel;${PROJECT_BINARY_DIR}/src;${PROJECT_BINARY_DIR}/gssapi")
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)

set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME libssoclient${PROJECT_VERSION_MAJOR})
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA ${PROJECT_SOURCE_DIR}/packaging/triggers)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libssoclient-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS
  "libssoclient${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION}), libboost1.81-dev | libboost-dev")
set(CPACK_DEBIAN_GSSAPI_PACKAGE_NAME libssoclient-gssapi${PROJECT_VERSION_MAJOR})
set(CPACK_DEBIAN_GSSAPI_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_GSSAPI_PACKAGE_DEPENDS "libssoclient${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION})")
set(CPACK_DEBIAN_GSSAPI_PACKAGE_CONTROL_EXTRA ${PROJECT_SOURCE_DIR}/packaging/triggers)
set(CPACK_DEBIAN_GSSAPI-DEVELOPMENT_PACKAGE_NAME libssoclient-gssapi-dev)
set(CPACK_DEBIAN_GSSAPI-DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_GSSAPI-DEVELOPMENT_PACKAGE_DEPENDS
  "libssoclient-gssapi${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION}), libssoclient-dev (= ${PROJECT_VERSION})")
set(CPACK_DEBIAN_TOOLS_PACKAGE_NAME ssoclient)
set(CPACK_DEBIAN_TOOLS_PACKAGE_SECTION utils)
# dpkg-shlibdeps does not know packages that are being made. Statically linked, the tool needs none of them.
if(BUILD_SHARED_LIBS)
  set(CPACK_DEBIAN_TOOLS_PACKAGE_DEPENDS "libssoclient${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION})")
  if(TARGET ssoclient_gssapi)
    string(APPEND CPACK_DEBIAN_TOOLS_PACKAGE_DEPENDS
      ", libssoclient-gssapi${PROJECT_VERSION_MAJOR} (= ${PROJECT_VERSION})")
  endif()
endif()
set(CPACK_DEBIAN_DEVSTS_PACKAGE_NAME ssoclient-devsts)
set(CPACK_DEBIAN_DEVSTS_PACKAGE_SECTION devel)

include(CPack)
