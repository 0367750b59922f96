# Fails unless the library's dynamic symbol table defines exactly its exports.
execute_process(COMMAND nm -D --defined-only ${LIBRARY}
  OUTPUT_VARIABLE table RESULT_VARIABLE failed)
if(failed)
  message(FATAL_ERROR "nm could not read ${LIBRARY}")
endif()
set(expected oAnalyticsGameEnter oAnalyticsGameExit oAnalyticsInit oAnalyticsSpecial
  oAuthGetGameId oAuthGetUserUuid oFreeText oGetVersion oInitialize oRegisterForLogs)
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

# Loading the library runs nothing of its own (no file is read at load) and
# registers nothing to destroy at exit, so that calls from the game's exit
# handlers and static destructors still find every process-wide state.
execute_process(COMMAND nm ${LIBRARY} OUTPUT_VARIABLE symbols)
string(REGEX MATCHALL "(_GLOBAL__sub_I_[^\n]*|__cxa_atexit|__cxa_thread_atexit[^\n]*)" load_or_exit "${symbols}")
if(load_or_exit)
  message(FATAL_ERROR "the library runs code at load or at exit: ${load_or_exit}")
endif()
