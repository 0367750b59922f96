# cmake -DPACKAGE=dir -DBINDING=OrvaneSDK.cs -DLIBRARY=lib -DVERSION=x.y.z -P check_unity_package.cmake
# fails unless the Unity package holds its four files, a package.json that names it and this version,
# and copies of what was built.
string(REGEX REPLACE "^.*/|\\.[0-9.]+$" "" library ${LIBRARY}) # Unity loads libOrvaneSDK.so, unversioned
file(GLOB_RECURSE found RELATIVE ${PACKAGE} ${PACKAGE}/*)
file(READ ${PACKAGE}/package.json manifest)
string(JSON name GET "${manifest}" name) # string(JSON) stops the script on text that is not JSON or lacks it
string(JSON version GET "${manifest}" version)
file(SHA256 ${PACKAGE}/Runtime/OrvaneSDK.cs binding)
file(SHA256 ${PACKAGE}/Plugins/x86_64/${library} copy)
list(APPEND found ${name} ${version} ${binding} ${copy})
file(SHA256 ${BINDING} binding)
file(SHA256 ${LIBRARY} copy)
set(expected Plugins/x86_64/${library} Runtime/Orvane.SDK.asmdef Runtime/OrvaneSDK.cs package.json
    com.orvane.sdk ${VERSION} ${binding} ${copy})
if(NOT found STREQUAL expected)
  message(FATAL_ERROR "the Unity package differs\n  expected: ${expected}\n  found:    ${found}")
endif()
