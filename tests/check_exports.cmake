# Fails unless the library's dynamic symbol table defines exactly its exports, and unless loading it
# runs nothing of its own (no file is read at load) and it registers nothing to destroy at exit, so
# that calls from the game's exit handlers and static destructors still find every process-wide state.
execute_process(COMMAND nm -D --defined-only ${LIBRARY} OUTPUT_VARIABLE table COMMAND_ERROR_IS_FATAL ANY)
string(REGEX MATCHALL "[0-9a-f]+ [TtWwDdBbRrVviu] [^\n]+" found "${table}")
list(TRANSFORM found REPLACE "^[0-9a-f]+ . " "")
list(SORT found)
set(expected oAnalyticsGameEnter oAnalyticsGameExit oAnalyticsInit oAnalyticsSpecial
  oAuthGetGameId oAuthGetUserUuid oFreeText oGetVersion oInitialize oRegisterForLogs)
if(NOT found STREQUAL expected)
  message(FATAL_ERROR "exported symbols differ\n  expected: ${expected}\n  found:    ${found}")
endif()
execute_process(COMMAND nm ${LIBRARY} OUTPUT_VARIABLE symbols COMMAND_ERROR_IS_FATAL ANY)
string(REGEX MATCHALL "(_GLOBAL__sub_I_[^\n]*|__cxa_atexit|__cxa_thread_atexit[^\n]*)"
  load_or_exit "${symbols}")
if(load_or_exit)
  message(FATAL_ERROR "the library runs code at load or at exit: ${load_or_exit}")
endif()
# dlclose must not unload it: each load and unload would leak what the load set up.
execute_process(COMMAND readelf -d ${LIBRARY} OUTPUT_VARIABLE dynamic COMMAND_ERROR_IS_FATAL ANY)
if(NOT dynamic MATCHES "FLAGS_1[^\n]*NODELETE")
  message(FATAL_ERROR "the library can be unloaded: it is not linked with -z nodelete")
endif()
