# Fails unless the library's dynamic symbol table defines exactly the eight
# exported functions and oGetVersion.
execute_process(COMMAND nm -D --defined-only ${LIBRARY}
  OUTPUT_VARIABLE table RESULT_VARIABLE failed)
if(failed)
  message(FATAL_ERROR "nm could not read ${LIBRARY}")
endif()
set(expected oAnalyticsGameEnter oAnalyticsGameExit oAnalyticsInit oAnalyticsSpecial
  oAuthGetGameId oAuthGetUserUuid oGetVersion oInitialize oRegisterForLogs)
string(REGEX MATCHALL "[0-9a-f]+ [TtWwDdBbRrVviu] [^\n]+" rows "${table}")
set(found "")
foreach(row IN LISTS rows)
  string(REGEX REPLACE "^[0-9a-f]+ [A-Za-z] " "" name "${row}")
  list(APPEND found ${name})
endforeach()
list(SORT found)
if(NOT found STREQUAL expected)
  message(FATAL_ERROR "exported symbols differ\n  expected: ${expected}\n  found:    ${found}")
endif()
message(STATUS "exports: ${found}")
