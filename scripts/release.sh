#!/usr/bin/env bash
# Makes the release archives, all four in build/release/:
#   OrvaneSDK-VERSION-linux-x86_64.tar.gz          the SDK for Linux
#   OrvaneSDK-VERSION-linux-x86_64-symbols.tar.gz  its .debug files
#   OrvaneSDK-VERSION-windows-x64.zip              the SDK for Windows (mingw-w64 DLL)
#   OrvaneSDK-VERSION-windows-x64-symbols.zip      its .debug files
# Each is a CMake workflow preset (configure, build, CPack); the builds are
# build/release-linux and build/release-windows.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh all
rm -rf build/release
for preset in release-linux release-windows; do
  printf '\n==== %s ====\n' "$preset"
  cmake --workflow --preset "$preset" --fresh
done
rm -rf build/release/_CPack_Packages
printf '\n'
ls -l build/release
