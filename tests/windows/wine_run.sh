#!/bin/bash
# Runs a Windows test program under wine for ctest.
#
#   wine_run.sh PREFIX PROGRAM.exe [ARGS...]
#
# Always in the build's own wine prefix, so that a test's C:\Orvane is the one
# inside the build directory and never the user's ~/.wine. Wine's diagnostics
# are off. The C runtime writes CR LF line ends; the CRs are removed so that
# gtest's test list parses and output compares as on Linux.
export WINEPREFIX=$1 WINEDEBUG=-all
shift
# Creating a prefix starts wine's services, which outlive the test: the prefix
# must exist beforehand (scripts/ci-windows.sh makes it).
if [ ! -f "$WINEPREFIX/system.reg" ]; then
  echo "wine_run.sh: no wine prefix at $WINEPREFIX; create it first (scripts/ci-windows.sh)" >&2
  exit 1
fi
# The output goes through a file, not a pipe: wine services that the program
# happens to start inherit its standard streams and live on, and a pipe held
# by them would keep ctest waiting for its end.
output=$(mktemp)
trap 'rm -f "$output"' EXIT
wine "$@" </dev/null >"$output" 2>&1
status=$?
tr -d '\r' <"$output"
exit $status
