# What `cmake --install` puts down and the release archives hold.
#
# Component `sdk`: everything a game team builds and ships with. Component
# `symbols`: the .debug files (cmake/debug_info.cmake), beside the binaries
# they belong to, kept out of the sdk archive.
#
#   Windows (ZIP)                             Linux (TGZ)
#   bin/OrvaneSDK.dll                         lib/libOrvaneSDK.so.1.0.0, .so.1, .so
#   bin/orvane-logcat.exe                     bin/orvane-logcat
#   lib/OrvaneSDK.lib, OrvaneSDK.def          lib/pkgconfig/orvanesdk.pc
#   lib/libOrvaneSDK.dll.a                    lib/cmake/OrvaneSDK/
#   lib/pkgconfig/orvanesdk.pc                include/OrvaneSDK.h, OrvaneSDKVersion.h
#   lib/cmake/OrvaneSDK/                      share/doc/OrvaneSDK/LICENSE, CHANGELOG.md, README.md
#   include/OrvaneSDK.h, OrvaneSDKVersion.h   share/OrvaneSDK/bindings/csharp/OrvaneSDK.cs
#   LICENSE, CHANGELOG.md, README.md
#   bindings/csharp/OrvaneSDK.cs
#   bindings/python/, bindings/lua/         share/OrvaneSDK/bindings/python/, lua/
#   examples/host.c                           share/OrvaneSDK/examples/host.c
# The binding ships as its one source file. The Unity package, with both
# platforms' libraries, is a release output of its own, made from these
# archives (scripts/unity-package.sh).
include(CMakePackageConfigHelpers)
set(cmake_dir ${CMAKE_INSTALL_LIBDIR}/cmake/OrvaneSDK)

install(TARGETS OrvaneSDK EXPORT OrvaneSDKTargets
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT sdk
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT sdk
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT sdk)
if(TARGET orvane-logcat)
  install(TARGETS orvane-logcat RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT sdk)
endif()
install(FILES include/OrvaneSDK.h ${PROJECT_BINARY_DIR}/include/OrvaneSDKVersion.h
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT sdk)

# CMake package: OrvaneSDK::OrvaneSDK, compatible within one major version.
install(EXPORT OrvaneSDKTargets NAMESPACE OrvaneSDK:: DESTINATION ${cmake_dir} COMPONENT sdk)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/OrvaneSDKConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES cmake/OrvaneSDKConfig.cmake ${PROJECT_BINARY_DIR}/OrvaneSDKConfigVersion.cmake
  DESTINATION ${cmake_dir} COMPONENT sdk)

# pkg-config, relocatable with the tree it lies in.
file(RELATIVE_PATH ORVANE_PC_PREFIX ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
string(REGEX REPLACE "/$" "" ORVANE_PC_PREFIX "${ORVANE_PC_PREFIX}")
configure_file(cmake/orvanesdk.pc.in ${PROJECT_BINARY_DIR}/orvanesdk.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/orvanesdk.pc
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT sdk)

# Documents at the top of a Windows archive, in share/doc on Linux.
if(WIN32)
  set(doc_dir .)
  set(share_dir .)
else()
  set(doc_dir ${CMAKE_INSTALL_DOCDIR})
  set(share_dir ${CMAKE_INSTALL_DATADIR}/OrvaneSDK)
endif()
install(FILES LICENSE CHANGELOG.md README.md DESTINATION ${doc_dir} COMPONENT sdk)
# The user pages beside the README, under docs/ as in the repository, so that its links hold; the
# contributors' pages (CONTRIBUTING.md, src/README.md) stay in the repository.
file(GLOB orvane_user_pages ${PROJECT_SOURCE_DIR}/docs/*.md)
install(FILES ${orvane_user_pages} DESTINATION ${doc_dir}/docs COMPONENT sdk)
install(FILES bindings/csharp/OrvaneSDK.cs DESTINATION ${share_dir}/bindings/csharp COMPONENT sdk)
# The script bindings as their source (Python: a package folder for pip), and the run-time loading
# example that docs/python.md and docs/lua.md point C hosts at.
install(FILES bindings/python/pyproject.toml DESTINATION ${share_dir}/bindings/python COMPONENT sdk)
install(FILES bindings/python/orvane/__init__.py DESTINATION ${share_dir}/bindings/python/orvane COMPONENT sdk)
install(FILES bindings/lua/orvane.lua DESTINATION ${share_dir}/bindings/lua COMPONENT sdk)
install(FILES examples/host.c DESTINATION ${share_dir}/examples COMPONENT sdk)

# Release archives: one with the sdk component, one with the symbols.
if(PROJECT_IS_TOP_LEVEL)
  set(CPACK_PACKAGE_NAME OrvaneSDK)
  set(CPACK_PACKAGE_VENDOR "the OrvaneSDK authors")
  set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "Analytics event log and launch identity for games")
  set(CPACK_RESOURCE_FILE_LICENSE ${PROJECT_SOURCE_DIR}/LICENSE)
  if(WIN32)
    set(CPACK_GENERATOR ZIP)
    set(CPACK_SYSTEM_NAME windows-x64)
  else()
    set(CPACK_GENERATOR TGZ)
    set(CPACK_SYSTEM_NAME linux-${CMAKE_SYSTEM_PROCESSOR})
  endif()
  set(CPACK_PACKAGE_FILE_NAME OrvaneSDK-${PROJECT_VERSION}-${CPACK_SYSTEM_NAME})
  set(CPACK_ARCHIVE_COMPONENT_INSTALL ON)
  set(CPACK_COMPONENTS_ALL sdk symbols)
  set(CPACK_ARCHIVE_SDK_FILE_NAME ${CPACK_PACKAGE_FILE_NAME})
  set(CPACK_ARCHIVE_SYMBOLS_FILE_NAME ${CPACK_PACKAGE_FILE_NAME}-symbols)
  set(CPACK_COMPONENT_INCLUDE_TOPLEVEL_DIRECTORY ON)
  set(CPACK_VERBATIM_VARIABLES ON)
  # CPack takes every member's times from SOURCE_DATE_EPOCH when set: the
  # release's (cmake/debug_info.cmake), so that a rebuild gives the same bytes.
  if(ORVANE_SOURCE_DATE_EPOCH)
    set(CPACK_PROJECT_CONFIG_FILE ${PROJECT_BINARY_DIR}/CPackReleaseTime.cmake)
    file(WRITE ${CPACK_PROJECT_CONFIG_FILE} "set(ENV{SOURCE_DATE_EPOCH} ${ORVANE_SOURCE_DATE_EPOCH})\n")
  endif()
  include(CPack)
endif()
