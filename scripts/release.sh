#!/usr/bin/env bash
# Makes the release archives, all four in build/release/, and the Unity package:
#   OrvaneSDK-VERSION-linux-x86_64.tar.gz          the SDK for Linux
#   OrvaneSDK-VERSION-linux-x86_64-symbols.tar.gz  its .debug files
#   OrvaneSDK-VERSION-windows-x64.zip              the SDK for Windows (clang + lld, mingw-w64 runtime)
#   OrvaneSDK-VERSION-windows-x64-symbols.zip      its .debug files and PDBs
#   com.orvane.sdk-VERSION.tgz                     the Unity package, both libraries
# Each archive is a CMake workflow preset (configure, build, CPack); the builds
# are build/release-linux and build/release-windows. The Unity package is made
# from the archives by scripts/unity-package.sh.
#   scripts/release.sh          the archives
#   scripts/release.sh twice    then the same sources again, in another folder
#                               and later, and fails unless every archive is
#                               the same bytes (diffoscope names what differs)
#   scripts/release.sh --unity-folder DIR
#                               DIR: the Unity package also as a folder, for a
#                               release branch
# Two builds of one commit agree: time stamps are SOURCE_DATE_EPOCH, the
# commit's time unless set; no path of the build folder is recorded; the
# archives' members are sorted and their modes those of umask 022.
set -euo pipefail
cd "$(dirname "$0")/.."
unity_folder=""
[ "${1:-}" = --unity-folder ] && unity_folder=$(realpath -m "$2")
scripts/install-deps.sh all
umask 022
if [ -z "${SOURCE_DATE_EPOCH:-}" ]; then
  SOURCE_DATE_EPOCH=$(git log -1 --format=%ct)
  export SOURCE_DATE_EPOCH
fi
# From nothing: an earlier build's objects would be reused, and a split
# re-run on an already stripped binary leaves an empty .debug.
rm -rf build/release build/release-linux build/release-windows
for preset in release-linux release-windows; do
  printf '\n==== %s ====\n' "$preset"
  cmake --workflow --preset "$preset" --fresh
done
rm -rf build/release/_CPack_Packages
scripts/unity-package.sh build/release ${unity_folder:+"$unity_folder"}
printf '\n'
ls -l build/release
[ "${1:-}" = twice ] || exit 0

# The tracked files as they are now, in a second folder: the same commit.
again=build/rebuild/OrvaneSDK
rm -rf build/rebuild && mkdir -p "$again"
git ls-files -z | xargs -0 tar -cf - | tar -xf - -C "$again"
printf '\n==== the same release again, in %s ====\n' "$again"
"$again/scripts/release.sh" >build/rebuild/release.log 2>&1 || { cat build/rebuild/release.log; exit 1; }
status=0
for archive in build/release/*; do
  name=${archive#build/release/}
  if ! cmp -s "$archive" "$again/build/release/$name"; then
    echo "FAILED: $name differs between the two builds:"
    diffoscope --no-progress --text - "$archive" "$again/build/release/$name" | head -60 || true
    status=1
  fi
done
[ "$(ls "$again/build/release")" = "$(ls build/release)" ] || { echo "FAILED: other archives"; status=1; }
[ $status -eq 0 ] && echo "release: the second build gave the same bytes in every archive"
exit $status
