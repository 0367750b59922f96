#!/bin/bash
# The public header as games compile it: every_function.c as each C standard and, as C++, each C++
# standard, with gcc, clang and mingw gcc, warnings as errors.  header_test.sh INCLUDE_DIR VERSION_INCLUDE_DIR
set -uo pipefail
here=$(cd "$(dirname "$0")" && pwd)
warnings=(-Wall -Wextra -Wpedantic -Werror)
cxx_warnings=(-Wold-style-cast -Wzero-as-null-pointer-constant)
failed=0 missing=0
for pair in gcc:g++ clang:clang++ x86_64-w64-mingw32-gcc:x86_64-w64-mingw32-g++; do
  for compiler in "${pair%%:*}" "${pair##*:}"; do
    if ! command -v "$compiler" >/dev/null; then
      echo "MISSING $compiler: its modes are not tested" && missing=1 && continue
    fi
    case $compiler in
    *++) modes="c++98 c++03 c++11 c++14 c++17 c++20 c++23:c++2b" language=(-x c++ "${cxx_warnings[@]}") ;;
    *) modes="c89 c99 c11 c17 c23:c2x" language=(-x c) ;;
    esac
    for mode in $modes; do # a mode the compiler knows only by its draft name is tried by that name too
      std=${mode%%:*}
      echo 'int x;' | "$compiler" "-std=$std" "${language[@]:0:2}" -c -o /dev/null - 2>/dev/null || std=${mode##*:}
      if "$compiler" "-std=$std" "${language[@]}" "${warnings[@]}" -I"$1" -I"$2" -c -o /dev/null \
        "$here/every_function.c"; then
        echo "ok      $compiler -std=$std"
      else
        echo "FAILED  $compiler -std=$std" && failed=1
      fi
    done
  done
done
[ $failed = 0 ] || exit 1
[ $missing = 0 ] || exit 77 # shown as skipped by ctest, never as passed
