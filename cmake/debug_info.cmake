# Debug information of the binaries we ship, kept apart from them.
#
# With ORVANE_SEPARATE_DEBUG_INFO in an optimised build, our own code is
# compiled with -g (orvane_debug_info), and each shipped binary is split right
# after it is linked:
#   objcopy --only-keep-debug  BINARY BINARY.debug   all symbols and DWARF
#   objcopy --strip-all        BINARY                what a game ships
#   objcopy --add-gnu-debuglink=BINARY.debug BINARY  name + CRC of the .debug
# gdb, and the binutils that read DWARF, find BINARY.debug through that link
# when it lies beside BINARY. -g does not change the code GCC generates.
# MSVC builds keep their own PDB handling and are left alone.
#
# Built with clang and lld for Windows (cmake/mingw-w64-x86_64-clang.cmake),
# the compiler writes CodeView beside the DWARF and lld writes BINARY's PDB,
# e.g. OrvaneSDK.pdb: Visual Studio, WinDbg, crash reporters and symbol
# servers match it by the GUID and age in the DLL's debug directory, which
# names it without a folder. gdb (also under wine) keeps reading the .debug.
#
# Time stamps that a release writes (the PE header, which objcopy sets, and
# the archive members) are ORVANE_SOURCE_DATE_EPOCH, SOURCE_DATE_EPOCH at
# configure time: scripts/release.sh sets it to the commit's time, so that
# two builds of one commit give the same bytes. It is fixed per configure, so
# a build that only re-runs the split never strips a stripped binary again.
add_library(orvane_debug_info INTERFACE)
set(ORVANE_SOURCE_DATE_EPOCH $ENV{SOURCE_DATE_EPOCH})
set(ORVANE_PDB OFF)
set(ORVANE_SPLIT_DEBUG_INFO OFF)
if(ORVANE_SEPARATE_DEBUG_INFO AND NOT MSVC AND CMAKE_BUILD_TYPE MATCHES "^(Release|RelWithDebInfo|MinSizeRel)$")
  if(NOT CMAKE_OBJCOPY)
    message(FATAL_ERROR "ORVANE_SEPARATE_DEBUG_INFO needs objcopy of the target's binutils")
  endif()
  set(ORVANE_SPLIT_DEBUG_INFO ON)
  target_compile_options(orvane_debug_info INTERFACE -g)
  if(WIN32 AND CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    set(ORVANE_PDB ON)
    target_compile_options(orvane_debug_info INTERFACE $<$<COMPILE_LANGUAGE:C,CXX>:-gcodeview -gdwarf>)
    foreach(step COMPILER LINKER)
      foreach(lang C CXX)
        set(CMAKE_${lang}_${step}_LAUNCHER bash ${PROJECT_SOURCE_DIR}/cmake/relative_paths.sh
          ${PROJECT_SOURCE_DIR} /usr/src/orvanesdk-${PROJECT_VERSION})
      endforeach()
    endforeach()
  endif()
  # The debug information names our files under one fixed folder, whatever
  # folder this build ran in: releases do not depend on the build machine,
  # and a debugger is pointed at the sources with one rule (README, "Debug
  # information"). The build folder is mapped last, so that it wins where it
  # lies inside the source folder; its generated headers then sit beside the
  # installed ones.
  set(ORVANE_SOURCE_PREFIX /usr/src/orvanesdk-${PROJECT_VERSION})
  target_compile_options(orvane_debug_info INTERFACE
    $<$<COMPILE_LANGUAGE:C,CXX>:-ffile-prefix-map=${PROJECT_SOURCE_DIR}=${ORVANE_SOURCE_PREFIX}>
    $<$<COMPILE_LANGUAGE:C,CXX>:-ffile-prefix-map=${PROJECT_BINARY_DIR}=${ORVANE_SOURCE_PREFIX}>)
endif()

# Splits TARGET's debug information into $<TARGET_FILE>.debug (and its PDB,
# where one is written) and installs those files beside the binary, in the
# `symbols` component; with no DESTINATION they stay in the build.
function(orvane_split_debug_info target)
  if(NOT ORVANE_SPLIT_DEBUG_INFO)
    return()
  endif()
  set(binary $<TARGET_FILE:${target}>)
  set(symbol_files ${binary}.debug)
  if(ORVANE_PDB)
    # %_PDB%: the debug directory names the PDB without the build's folder;
    # lld's own time stamp is left out, objcopy writes the release's.
    set(pdb $<TARGET_FILE_DIR:${target}>/$<TARGET_FILE_BASE_NAME:${target}>.pdb)
    target_link_options(${target} PRIVATE -Wl,--pdb=${pdb} -Wl,--Xlink=-pdbaltpath:%_PDB%
      -Wl,--Xlink=-pdbsourcepath:${ORVANE_SOURCE_PREFIX} -Wl,--no-insert-timestamp)
    list(APPEND symbol_files ${pdb})
  endif()
  set(objcopy ${CMAKE_OBJCOPY})
  if(ORVANE_SOURCE_DATE_EPOCH AND WIN32)
    set(objcopy ${CMAKE_COMMAND} -E env SOURCE_DATE_EPOCH=${ORVANE_SOURCE_DATE_EPOCH} ${CMAKE_OBJCOPY})
  endif()
  add_custom_command(TARGET ${target} POST_BUILD
    COMMAND ${objcopy} --only-keep-debug ${binary} ${binary}.debug
    COMMAND ${objcopy} --strip-all ${binary}
    COMMAND ${objcopy} --add-gnu-debuglink=${binary}.debug ${binary}
    VERBATIM)
  if(ORVANE_INSTALL AND ARGC GREATER 1)
    install(FILES ${symbol_files} DESTINATION ${ARGV1} COMPONENT symbols)
  endif()
endfunction()
