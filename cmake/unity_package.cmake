# Lays out the Unity package com.orvane.sdk in the folder OUT:
#   cmake -DVERSION=x.y.z -DOUT=folder -DLIBRARIES="OrvaneSDK.dll;libOrvaneSDK.so.x.y.z" -P unity_package.cmake
# Its files are those of bindings/csharp/unity/ (package.json from its
# template) and, under their package names, the binding, the changelog, the
# licence, docs/unity.md as the integration guide and the libraries given,
# Unity's names without the version. Each asset takes the .meta committed
# beside its place in bindings/csharp/unity/: their GUIDs and import settings
# are fixed there, and a .meta whose asset is not in this package is left out
# (a build holds only its own platform's library). The release's tarball is
# made from this folder by scripts/unity-package.sh.
cmake_minimum_required(VERSION 3.25)
get_filename_component(root ${CMAKE_CURRENT_LIST_DIR}/.. ABSOLUTE)
set(template ${root}/bindings/csharp/unity)
file(REMOVE_RECURSE ${OUT})

file(GLOB_RECURSE assets RELATIVE ${template} ${template}/*)
list(FILTER assets EXCLUDE REGEX "\\.(meta|in)$")
foreach(asset IN LISTS assets)
  configure_file(${template}/${asset} ${OUT}/${asset} COPYONLY)
endforeach()
configure_file(${template}/package.json.in ${OUT}/package.json @ONLY)
configure_file(${root}/bindings/csharp/OrvaneSDK.cs ${OUT}/Runtime/OrvaneSDK.cs COPYONLY)
configure_file(${root}/CHANGELOG.md ${OUT}/CHANGELOG.md COPYONLY)
configure_file(${root}/LICENSE ${OUT}/LICENSE.md COPYONLY)
configure_file(${root}/docs/unity.md ${OUT}/Documentation~/com.orvane.sdk.md COPYONLY)
foreach(library IN LISTS LIBRARIES)
  get_filename_component(name ${library} NAME)
  string(REGEX REPLACE "(\\.so)\\.[0-9.]+$" "\\1" name ${name}) # Unity loads libOrvaneSDK.so
  configure_file(${library} ${OUT}/Runtime/Plugins/x86_64/${name} COPYONLY)
endforeach()

file(GLOB_RECURSE metas RELATIVE ${template} LIST_DIRECTORIES false ${template}/*.meta)
foreach(meta IN LISTS metas)
  string(REGEX REPLACE "\\.meta$" "" asset ${meta})
  if(EXISTS ${OUT}/${asset})
    configure_file(${template}/${meta} ${OUT}/${meta} COPYONLY)
  endif()
endforeach()
