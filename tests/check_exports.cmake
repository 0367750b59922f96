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
# A stripped library has its symbols in the .debug beside it.
set(symbol_file ${LIBRARY})
if(EXISTS ${LIBRARY}.debug)
  set(symbol_file ${LIBRARY}.debug)
endif()
execute_process(COMMAND nm ${symbol_file} OUTPUT_VARIABLE symbols COMMAND_ERROR_IS_FATAL ANY)
execute_process(COMMAND nm -D --undefined-only ${LIBRARY} OUTPUT_VARIABLE imports COMMAND_ERROR_IS_FATAL ANY)
if(NOT symbols MATCHES " T oInitialize\n")
  message(FATAL_ERROR "${symbol_file} has no symbol table to check")
endif()
string(REGEX MATCHALL "(_GLOBAL__sub_I_[^\n]*|__cxa_atexit|__cxa_thread_atexit[^\n]*)"
  load_or_exit "${symbols}${imports}")
# Whatever the symbols say, the loader runs one entry at load: the C
# runtime's frame_dummy, and no .ctors. A sanitizer adds its own module
# constructor, so a sanitized build is judged by its symbols alone.
execute_process(COMMAND readelf -dSW ${LIBRARY} OUTPUT_VARIABLE dynamic COMMAND_ERROR_IS_FATAL ANY)
if(NOT SANITIZED AND NOT dynamic MATCHES "\\(INIT_ARRAYSZ\\) +8 \\(bytes\\)" OR dynamic MATCHES "\\.ctors")
  list(APPEND load_or_exit "more than the C runtime's entry in .init_array or .ctors")
endif()
if(load_or_exit)
  message(FATAL_ERROR "the library runs code at load or at exit: ${load_or_exit}")
endif()
# dlclose must not unload it: each load and unload would leak what the load set up.
if(NOT dynamic MATCHES "FLAGS_1[^\n]*NODELETE")
  message(FATAL_ERROR "the library can be unloaded: it is not linked with -z nodelete")
endif()
