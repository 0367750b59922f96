# Fails unless the DLL's export table holds exactly the exports under their
# plain names, its import table names only system DLLs, so that a game ships OrvaneSDK.dll alone: no libstdc++, libgcc or
# winpthread DLL, and its version resource carries VERSION.
#
#   cmake -DOBJDUMP=... -DWINDRES=... -DLIBRARY=OrvaneSDK.dll -DIMPORTS="a.dll;b.dll"
#         -DVERSION=1.2.3 -P check_dll_tables.cmake
execute_process(COMMAND ${OBJDUMP} -p ${LIBRARY}
  OUTPUT_VARIABLE table RESULT_VARIABLE failed)
if(failed)
  message(FATAL_ERROR "${OBJDUMP} could not read ${LIBRARY}")
endif()

# Exports: the rows of the name pointer table, "\t[   0] oAnalyticsGameEnter".
string(REGEX MATCH "\\[Ordinal/Name Pointer\\] Table[^\n]*\n(([ \t]+\\[ *[0-9]+\\] [^\n]*\n)*)"
  names "${table}")
# (Brackets never enter a list here: CMake would not split inside them.)
string(REGEX REPLACE "[ \t]+\\[ *[0-9]+\\] " "" names "${CMAKE_MATCH_1}")
string(STRIP "${names}" names)
string(REPLACE "\n" ";" exports "${names}")
list(SORT exports)
set(expected oAnalyticsGameEnter oAnalyticsGameExit oAnalyticsInit oAnalyticsSpecial
  oAuthGetGameId oAuthGetUserUuid oFreeText oGetVersion oInitialize oRegisterForLogs)
if(NOT exports STREQUAL expected)
  message(FATAL_ERROR "exports differ\n  expected: ${expected}\n  found:    ${exports}")
endif()

string(REGEX MATCHALL "DLL Name: [^\n]+" rows "${table}")
set(imports "")
foreach(row IN LISTS rows)
  string(SUBSTRING "${row}" 10 -1 name)
  string(TOLOWER "${name}" name)
  list(APPEND imports "${name}")
endforeach()
list(SORT imports)
string(TOLOWER "${IMPORTS}" allowed)
list(SORT allowed)
if(NOT imports STREQUAL allowed)
  message(FATAL_ERROR "imports differ\n  expected: ${allowed}\n  found:    ${imports}")
endif()
# The version resource, as windres decompiles it from the DLL.
execute_process(COMMAND ${WINDRES} -i ${LIBRARY} -O rc OUTPUT_VARIABLE resource)
string(REPLACE "." ", " numbers "${VERSION}")
foreach(line "FILEVERSION ${numbers}, 0" "PRODUCTVERSION ${numbers}, 0"
    "\"FileVersion\", \"${VERSION}\"" "\"ProductVersion\", \"${VERSION}\""
    "\"ProductName\", \"OrvaneSDK\"" "\"FileDescription\", \"OrvaneSDK: ")
  string(FIND "${resource}" "${line}" at)
  if(at EQUAL -1)
    message(FATAL_ERROR "version resource lacks ${line}:\n${resource}")
  endif()
endforeach()
message(STATUS "exports: ${exports}")
message(STATUS "imports: ${imports}")
