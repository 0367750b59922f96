#!/bin/bash
# wine_run.sh PREFIX PROGRAM.exe [ARGS...]: runs it in the build's own prefix
# (never ~/.wine), the CRs of its output dropped to compare as on Linux.
# A new prefix starts wine's services, which outlive the test and hold its
# output open: scripts/ci-windows.sh makes the prefix beforehand, and the
# output goes through a file, which services the program starts may inherit.
[ -f "$1/system.reg" ] || { echo "wine_run.sh: no wine prefix at $1" >&2; exit 1; }
output=$(mktemp)
trap 'tr -d "\r" <"$output"; rm -f "$output"' EXIT # the exit status stays wine's
WINEPREFIX=$1 WINEDEBUG=-all wine "${@:2}" </dev/null >"$output" 2>&1
