# SPDX-License-Identifier: Apache-2.0
# Compiles through ccache where it is installed. What was compiled before is not compiled again, in another build folder and
# in another clone neither: paths below the checkout count as relative, and the build folder does not count.

option(SSOCLIENT_COMPILER_CACHE "Compile through ccache when it is installed" ${PROJECT_IS_TOP_LEVEL})

if(SSOCLIENT_COMPILER_CACHE AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
  find_program(SSOCLIENT_CCACHE ccache)
  mark_as_advanced(SSOCLIENT_CCACHE)
  if(SSOCLIENT_CCACHE)
    # A precompiled header is only cached when ccache need not fear that a time or a macro of it differs.
    set(CMAKE_CXX_COMPILER_LAUNCHER env CCACHE_BASEDIR=${PROJECT_SOURCE_DIR} CCACHE_NOHASHDIR=1 CCACHE_DEPEND=1
      CCACHE_SLOPPINESS=pch_defines,time_macros,include_file_mtime,include_file_ctime ${SSOCLIENT_CCACHE})
  endif()
endif()
