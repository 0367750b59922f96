#!/bin/bash
# Runs a Windows test program under wine for ctest.
#
#   wine_run.sh PREFIX PROGRAM.exe [ARGS...]
#
# Always in the build's own wine prefix, so that a test's C:\Orvane is the one
# inside the build directory and never the user's ~/.wine. Wine's diagnostics
# are off. The C runtime writes CR LF line ends; the CRs are removed so that
# gtest's test list parses and output compares as on Linux.
set -o pipefail
export WINEPREFIX=$1 WINEDEBUG=-all
shift
# Creating a prefix starts wine's services, which outlive the test and keep
# ctest waiting for their output: the prefix must exist beforehand.
if [ ! -f "$WINEPREFIX/system.reg" ]; then
  echo "wine_run.sh: no wine prefix at $WINEPREFIX; create it first (scripts/ci-windows.sh)" >&2
  exit 1
fi
wine "$@" 2>&1 | tr -d '\r'
