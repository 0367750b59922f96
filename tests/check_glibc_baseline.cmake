# Fails when a binary we ship would not load on glibc 2.31 with GCC 10's libstdc++ (Debian 11, Ubuntu
# 20.04, the Debian 11 based game runtimes): a symbol version newer than GLIBC_2.31, GLIBCXX_3.4.28 or
# CXXABI_1.3.12, or a libcrypto named to the loader (it is found at the first record instead).
#   cmake -DLIBRARY=libOrvaneSDK.so.1.0.0 -DPROGRAM=orvane-logcat -P check_glibc_baseline.cmake
set(newest_GLIBC 2.31)
set(newest_GLIBCXX 3.4.28)
set(newest_CXXABI 1.3.12)
set(problems "")
foreach(file ${LIBRARY} ${PROGRAM})
  execute_process(COMMAND objdump -T -p ${file} OUTPUT_VARIABLE table COMMAND_ERROR_IS_FATAL ANY)
  # "... (GLIBC_2.33) fstat" or "... GLIBC_2.2.5 dlopen": a symbol and the version it needs.
  string(REGEX MATCHALL "(GLIBC|GLIBCXX|CXXABI)_[0-9.]+\\)?[ \t]+[^ \t\n]+" uses "${table}")
  foreach(use IN LISTS uses)
    string(REGEX MATCH "^([A-Z]+)_([0-9.]+)\\)?[ \t]+(.*)$" _ "${use}")
    if(CMAKE_MATCH_2 VERSION_GREATER newest_${CMAKE_MATCH_1})
      string(APPEND problems "\n  ${file}: ${CMAKE_MATCH_3}@${CMAKE_MATCH_1}_${CMAKE_MATCH_2}")
    endif()
  endforeach()
  string(REGEX MATCHALL "NEEDED[ \t]+libcrypto[^\n]*" crypto "${table}")
  foreach(needed IN LISTS crypto)
    string(APPEND problems "\n  ${file}: ${needed}")
  endforeach()
endforeach()
if(problems)
  message(FATAL_ERROR "newer than GLIBC_${newest_GLIBC}, GLIBCXX_${newest_GLIBCXX} or "
                      "CXXABI_${newest_CXXABI}, or a libcrypto named:${problems}")
endif()
