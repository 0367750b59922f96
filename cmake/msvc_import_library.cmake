# OrvaneSDK.def and the MSVC import library OrvaneSDK.lib of the mingw DLL.
#
# The linker writes the .def from the DLL's actual export table, so it never
# drifts from the exports. llvm-dlltool (Debian's llvm) turns it into
# OrvaneSDK.lib in the short import format that Microsoft's lib.exe writes,
# with the same code as llvm-lib and lld-link: link.exe reads it as one of its
# own. GNU dlltool would write binutils' older format (import tables put
# together from small objects, like libOrvaneSDK.dll.a), which link.exe reads
# in simple cases only.
find_program(ORVANE_LLVM_DLLTOOL NAMES llvm-dlltool llvm-dlltool-14 REQUIRED)
set(ORVANE_DEF_FILE ${CMAKE_CURRENT_BINARY_DIR}/OrvaneSDK.def)
set(ORVANE_MSVC_IMPORT_LIBRARY ${CMAKE_CURRENT_BINARY_DIR}/OrvaneSDK.lib)
target_link_options(OrvaneSDK PRIVATE -Wl,--output-def,${ORVANE_DEF_FILE})
add_custom_command(TARGET OrvaneSDK POST_BUILD
  COMMAND ${ORVANE_LLVM_DLLTOOL} -m i386:x86-64 -D $<TARGET_FILE_NAME:OrvaneSDK>
          -d ${ORVANE_DEF_FILE} -l ${ORVANE_MSVC_IMPORT_LIBRARY}
  BYPRODUCTS ${ORVANE_DEF_FILE} ${ORVANE_MSVC_IMPORT_LIBRARY}
  VERBATIM)
if(ORVANE_INSTALL)
  install(FILES ${ORVANE_MSVC_IMPORT_LIBRARY} ${ORVANE_DEF_FILE}
    DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT sdk)
endif()
