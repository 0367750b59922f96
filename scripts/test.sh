#!/usr/bin/env bash
# The whole test run, as CI does it: the Linux build with warnings as errors,
# its tests plain, its library loaded on Debian 11 (glibc 2.31, OpenSSL 1.1),
# the tests under AddressSanitizer + UBSan and under ThreadSanitizer, the
# Windows DLL under wine, the release archives with game builds against them,
# then each fuzzer for a bounded time.
#   scripts/test.sh            everything
#   scripts/test.sh quick      the Linux build and its tests only
#   scripts/test.sh package    the release archives and the game builds only
set -euo pipefail
cd "$(dirname "$0")/.."
mode="${1:-all}"
jobs=2

step() { printf '\n==== %s ====\n' "$*"; }

if [ "$mode" = quick ]; then scripts/install-deps.sh linux; else scripts/install-deps.sh all; fi

package_leg() {
  step "Release archives, built twice in two folders and compared (scripts/release.sh twice)"
  scripts/release.sh twice
  step "Package: the README's adoption recipes against the archives (CMake, pkg-config, mingw, C#, MSVC ABI)"
  bash tests/package/consumers.sh build/release build/package
}
if [ "$mode" = package ]; then
  package_leg
  exit 0
fi

step "Linux build (warnings are errors)"
cmake --preset ci >/dev/null
cmake --build --preset ci -j "$jobs"
step "Linux tests"
ctest --preset ci -j "$jobs"

[ "$mode" = quick ] && exit 0

step "Debian 11: the library above on glibc 2.31 with OpenSSL 1.1 (scripts/debian11-leg.sh)"
scripts/debian11-leg.sh build/ci

step "AddressSanitizer + UndefinedBehaviorSanitizer"
cmake --preset asan -DORVANE_WARNINGS_AS_ERRORS=ON >/dev/null
cmake --build --preset asan -j "$jobs"
ctest --preset asan -j "$jobs"

step "ThreadSanitizer"
cmake --preset tsan -DORVANE_WARNINGS_AS_ERRORS=ON >/dev/null
cmake --build --preset tsan -j "$jobs"
ctest --preset tsan -j "$jobs"

if [ -x scripts/ci-windows.sh ]; then
  step "Windows DLL under wine"
  scripts/ci-windows.sh
fi

package_leg

if [ -x scripts/fuzz.sh ]; then
  step "Fuzzers"
  scripts/fuzz.sh "${ORVANE_FUZZ_SECONDS:-30}"
fi

step "All legs passed"
