# SPDX-License-Identifier: Apache-2.0
# Compiles through ccache where it is installed. A source that was compiled before is not compiled again, even in another build
# folder or another clone: ccache treats paths below the checkout as relative and ignores the build folder.

option(SSOCLIENT_COMPILER_CACHE "Compile through ccache when it is installed" ${PROJECT_IS_TOP_LEVEL})

if(SSOCLIENT_COMPILER_CACHE AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
  find_program(SSOCLIENT_CCACHE ccache)
  mark_as_advanced(SSOCLIENT_CCACHE)
  if(SSOCLIENT_CCACHE)
    # ccache caches a source that uses a precompiled header only with the sloppiness pch_defines and time_macros. Without
    # CCACHE_DEPEND it would run the preprocessor before each compilation that is new to it.
    set(CMAKE_CXX_COMPILER_LAUNCHER env CCACHE_BASEDIR=${PROJECT_SOURCE_DIR} CCACHE_NOHASHDIR=1 CCACHE_DEPEND=1
      CCACHE_SLOPPINESS=pch_defines,time_macros,include_file_mtime,include_file_ctime ${SSOCLIENT_CCACHE})
  endif()
endif()
