#!/usr/bin/env bash
# The Unity package of a release, with the Windows DLL and the Linux library
# taken out of the release archives, so that they are the bytes those
# archives hold and their symbols archives describe:
#   RELEASE/com.orvane.sdk-VERSION.tgz   the tarball, laid out as npm pack makes it
#   FOLDER/                               the same package as a folder (if given),
#                                         to be committed to a release branch
# Reproducible: members sorted, owned by 0:0, modes 0644/0755, every time
# SOURCE_DATE_EPOCH or else the time of the checked-out commit.
#   scripts/unity-package.sh RELEASE [FOLDER]
set -euo pipefail
cd "$(dirname "$0")/.."
release=$1 folder=${2:-}
version=$(sed -n 's/^project(OrvaneSDK VERSION \([0-9.]*\).*/\1/p' CMakeLists.txt)
epoch=${SOURCE_DATE_EPOCH:-$(git log -1 --format=%ct)}
work=build/unity-package
rm -rf "$work" && mkdir -p "$work/archives"
tar -xzf "$release/OrvaneSDK-$version-linux-x86_64.tar.gz" -C "$work/archives"
(cd "$work/archives" && cmake -E tar xf "$OLDPWD/$release/OrvaneSDK-$version-windows-x64.zip")
libraries="$work/archives/OrvaneSDK-$version-windows-x64/bin/OrvaneSDK.dll"
libraries+=";$work/archives/OrvaneSDK-$version-linux-x86_64/lib/libOrvaneSDK.so.$version"
cmake -DVERSION="$version" -DOUT="$work/package" -DLIBRARIES="$libraries" -P cmake/unity_package.cmake
find "$work/package" -type d -exec chmod 0755 {} + -o -type f -exec chmod 0644 {} +
tar -C "$work" --sort=name --owner=0 --group=0 --numeric-owner --mtime="@$epoch" --format=ustar -cf - package |
  gzip -9n >"$release/com.orvane.sdk-$version.tgz"
if [ -n "$folder" ]; then
  rm -rf "$folder" && mkdir -p "$folder" && cp -R "$work/package/." "$folder/"
fi
