#!/usr/bin/env bash
# The Windows leg: OrvaneSDK.dll cross-built with mingw-w64, its tests run
# under wine. Installs nothing: it expects the Debian packages
# g++-mingw-w64-x86-64-posix, wine, wine64, googletest and openssl.
#   scripts/ci-windows.sh      configure, build and test the `windows` preset
set -euo pipefail
cd "$(dirname "$0")/.."
jobs=2

# The tests' C:\ is the one in the build directory's own prefix, never ~/.wine.
export WINEPREFIX="$PWD/build/windows/wineprefix" WINEDEBUG=-all

cmake --preset windows >/dev/null
cmake --build --preset windows -j "$jobs"

# One wine session for the whole run, begun before ctest and detached from its
# output. Creating a prefix inside a test would hang ctest: wine's services
# outlive the test and hold its output pipe. wineboot -i creates (or updates)
# the prefix and wineserver -w waits for that session to end. Then a
# persistent wineserver keeps every test's wine start fast, and wineboot
# starts the session's services, both with their standard streams away from
# ctest's. The server is stopped however this script ends.
trap 'wineserver -k >/dev/null 2>&1 || true' EXIT
wineboot -i </dev/null >/dev/null 2>&1
wineserver -w
wineserver -p </dev/null >/dev/null 2>&1
wineboot </dev/null >/dev/null 2>&1

ctest --preset windows -j "$jobs"
