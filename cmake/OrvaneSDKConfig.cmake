# find_package(OrvaneSDK 1.0 REQUIRED) gives the imported target
# OrvaneSDK::OrvaneSDK: the shared library (the DLL and its import library on
# Windows), the include directory and the import side of ORVANE_API. The
# library's own dependencies are private to it: nothing else to find.
include("${CMAKE_CURRENT_LIST_DIR}/OrvaneSDKTargets.cmake")

# The Windows package is built with mingw-w64. An MSVC or clang-cl project
# links the same DLL through the MSVC import library shipped beside it.
get_filename_component(_orvane_msvc_lib "${CMAKE_CURRENT_LIST_DIR}/../../OrvaneSDK.lib" ABSOLUTE)
if(MSVC AND EXISTS "${_orvane_msvc_lib}")
  set_target_properties(OrvaneSDK::OrvaneSDK PROPERTIES
    IMPORTED_IMPLIB "${_orvane_msvc_lib}" IMPORTED_IMPLIB_RELEASE "${_orvane_msvc_lib}")
endif()
unset(_orvane_msvc_lib)
