# Fails unless the DLL's export table holds exactly the nine functions under
# their plain names and its import table names only system DLLs, so that a
# game ships OrvaneSDK.dll alone: no libstdc++, libgcc or winpthread DLL.
#
#   cmake -DOBJDUMP=... -DLIBRARY=OrvaneSDK.dll -DIMPORTS="a.dll;b.dll" -P check_dll_tables.cmake
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
  oAuthGetGameId oAuthGetUserUuid oFreeText oInitialize oRegisterForLogs)
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
message(STATUS "exports: ${exports}")
message(STATUS "imports: ${imports}")
