# The Windows DLL and orvane-logcat.exe built with clang and lld for the
# mingw-w64 target, against the same mingw-w64 headers, libstdc++ and
# winpthread as mingw-w64-x86_64.cmake (whose settings this takes). Only clang
# writes CodeView and only lld the PDB a Windows debugger, crash reporter or
# symbol server reads (cmake/debug_info.cmake); the DLL's imports and exports
# are those of the GCC build.
include(${CMAKE_CURRENT_LIST_DIR}/mingw-w64-x86_64.cmake)

set(CMAKE_C_COMPILER clang)
set(CMAKE_CXX_COMPILER clang++)
set(CMAKE_C_COMPILER_TARGET ${ORVANE_MINGW_PREFIX})
set(CMAKE_CXX_COMPILER_TARGET ${ORVANE_MINGW_PREFIX})

# Debian's clang does not find the C++ runtime of Debian's mingw-w64 GCC
# (lib/gcc/x86_64-w64-mingw32/12-posix): its folder is asked of that GCC.
execute_process(COMMAND ${ORVANE_MINGW_PREFIX}-g++-posix -print-libgcc-file-name
  OUTPUT_VARIABLE orvane_libgcc OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
get_filename_component(ORVANE_MINGW_GCC_DIR ${orvane_libgcc} DIRECTORY)
set(orvane_cxx ${ORVANE_MINGW_GCC_DIR}/include/c++)
set(CMAKE_CXX_FLAGS_INIT
  "-nostdinc++ -isystem ${orvane_cxx} -isystem ${orvane_cxx}/${ORVANE_MINGW_PREFIX} -isystem ${orvane_cxx}/backward")
# GCC's driver adds winpthread for its posix thread model (std::thread and
# the C++ runtime's thread-local data need it); clang's does not.
foreach(kind EXE SHARED MODULE)
  set(CMAKE_${kind}_LINKER_FLAGS_INIT "-fuse-ld=lld -L${ORVANE_MINGW_GCC_DIR} -Wno-unused-command-line-argument")
endforeach()
set(CMAKE_C_STANDARD_LIBRARIES "-lpthread" CACHE STRING "")
set(CMAKE_CXX_STANDARD_LIBRARIES "-lpthread" CACHE STRING "")
# binutils' objcopy splits the .debug file off (cmake/debug_info.cmake) and
# keeps lld's debug directory.
set(CMAKE_OBJCOPY ${ORVANE_MINGW_PREFIX}-objcopy CACHE FILEPATH "")
# lld's MinGW driver has no --push-state, which CMake's Windows-GNU rules
# wrap a whole archive in when the host's GNU ld has it; its answer is set.
set(_CMAKE_LINKER_PUSHPOP_STATE_SUPPORTED FALSE CACHE INTERNAL "")
