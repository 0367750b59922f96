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
add_library(orvane_debug_info INTERFACE)
set(ORVANE_SPLIT_DEBUG_INFO OFF)
if(ORVANE_SEPARATE_DEBUG_INFO AND NOT MSVC AND CMAKE_BUILD_TYPE MATCHES "^(Release|RelWithDebInfo|MinSizeRel)$")
  if(NOT CMAKE_OBJCOPY)
    message(FATAL_ERROR "ORVANE_SEPARATE_DEBUG_INFO needs objcopy of the target's binutils")
  endif()
  set(ORVANE_SPLIT_DEBUG_INFO ON)
  target_compile_options(orvane_debug_info INTERFACE -g)
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

# Splits TARGET's debug information into $<TARGET_FILE>.debug and installs that
# file beside the binary, in the `symbols` component.
function(orvane_split_debug_info target destination)
  if(NOT ORVANE_SPLIT_DEBUG_INFO)
    return()
  endif()
  set(binary $<TARGET_FILE:${target}>)
  add_custom_command(TARGET ${target} POST_BUILD
    COMMAND ${CMAKE_OBJCOPY} --only-keep-debug ${binary} ${binary}.debug
    COMMAND ${CMAKE_OBJCOPY} --strip-all ${binary}
    COMMAND ${CMAKE_OBJCOPY} --add-gnu-debuglink=${binary}.debug ${binary}
    VERBATIM)
  if(ORVANE_INSTALL)
    install(FILES ${binary}.debug DESTINATION ${destination} COMPONENT symbols)
  endif()
endfunction()
