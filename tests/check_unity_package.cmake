# Fails unless the Unity package folder holds exactly what a Unity project
# needs: a package.json and an assembly definition that parse and name the
# package, the binding as written, and the library as built.
#
#   cmake -DPACKAGE=dir -DBINDING=OrvaneSDK.cs -DLIBRARY=lib -DVERSION=x.y.z -P check_unity_package.cmake
get_filename_component(library_name ${LIBRARY} NAME)
string(REGEX REPLACE "\\.so\\..*$" ".so" library_name "${library_name}") # Unity loads the unversioned name
file(GLOB_RECURSE files RELATIVE ${PACKAGE} ${PACKAGE}/*)
list(SORT files)
set(expected Plugins/x86_64/${library_name} Runtime/Orvane.SDK.asmdef Runtime/OrvaneSDK.cs package.json)
list(SORT expected)
if(NOT files STREQUAL expected)
  message(FATAL_ERROR "package files differ\n  expected: ${expected}\n  found:    ${files}")
endif()

# string(JSON) stops the script on text that is not JSON or lacks a member.
file(READ ${PACKAGE}/package.json manifest)
string(JSON name GET "${manifest}" name)
string(JSON version GET "${manifest}" version)
string(JSON unity GET "${manifest}" unity)
file(READ ${PACKAGE}/Runtime/Orvane.SDK.asmdef asmdef)
string(JSON assembly GET "${asmdef}" name)
if(NOT name STREQUAL "com.orvane.sdk" OR NOT version STREQUAL VERSION OR NOT unity MATCHES "^20[0-9][0-9]\\.[0-9]+$"
   OR NOT assembly STREQUAL "Orvane.SDK")
  message(FATAL_ERROR "package.json or the assembly definition is wrong: ${name} ${version} ${unity} ${assembly}")
endif()

foreach(pair "Runtime/OrvaneSDK.cs;${BINDING}" "Plugins/x86_64/${library_name};${LIBRARY}")
  list(GET pair 0 copy)
  list(GET pair 1 original)
  file(SHA256 ${PACKAGE}/${copy} copy_hash)
  file(SHA256 ${original} original_hash)
  if(NOT copy_hash STREQUAL original_hash)
    message(FATAL_ERROR "${copy} is not a copy of ${original}")
  endif()
endforeach()
message(STATUS "Unity package ${name} ${version}: ${files}")
