#!/usr/bin/env bash
# Makes the release archives, all four in build/release/, and the Unity package:
#   OrvaneSDK-VERSION-linux-x86_64.tar.gz          the SDK for Linux
#   OrvaneSDK-VERSION-linux-x86_64-symbols.tar.gz  its .debug files
#   OrvaneSDK-VERSION-windows-x64.zip              the SDK for Windows (mingw-w64 DLL)
#   OrvaneSDK-VERSION-windows-x64-symbols.zip      its .debug files
#   com.orvane.sdk-VERSION.tgz                     the Unity package, both libraries
# Each archive is a CMake workflow preset (configure, build, CPack); the builds
# are build/release-linux and build/release-windows. The Unity package is made
# from the archives by scripts/unity-package.sh.
#   scripts/release.sh [--unity-folder DIR]   DIR: the Unity package also as a
#                                             folder, for a release branch
set -euo pipefail
cd "$(dirname "$0")/.."
unity_folder=""
[ "${1:-}" = --unity-folder ] && unity_folder=$(realpath -m "$2")
scripts/install-deps.sh all
rm -rf build/release
for preset in release-linux release-windows; do
  printf '\n==== %s ====\n' "$preset"
  cmake --workflow --preset "$preset" --fresh
done
rm -rf build/release/_CPack_Packages
scripts/unity-package.sh build/release ${unity_folder:+"$unity_folder"}
printf '\n'
ls -l build/release
