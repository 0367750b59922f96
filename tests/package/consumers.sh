#!/bin/bash
# The release archives as game teams take them: unpacked, then four tiny games
# (consumer.c) built against them, never against the source tree:
#   a  Linux, find_package(OrvaneSDK 1.0 REQUIRED)   b  Linux, pkg-config
#   c  mingw-w64, find_package, run under wine
#   d  MSVC ABI: clang + lld-link against OrvaneSDK.lib, no C runtime, under wine
# Each records a game's first event on a new log, which the packaged Linux
# orvane-logcat reads back as an INIT and an ENTER record. Also checked: the
# SONAME, the stripped DLL's size, and gdb finding our functions' source lines
# through each library's separate symbols file.
#   consumers.sh PACKAGE_DIR WORK_DIR      (WORK_DIR/wineprefix is kept)
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
packages=$(cd "$1" && pwd)
mkdir -p "$2" && cd "$2" && rm -rf run && mkdir run
export WINEPREFIX=$PWD/wineprefix WINEDEBUG=-all
cd run
for archive in "$packages"/OrvaneSDK-*; do cmake -E tar xf "$archive"; done
linux=$(echo "$PWD"/OrvaneSDK-*-linux-*) windows=$(echo "$PWD"/OrvaneSDK-*-windows-*)
export PKG_CONFIG_PATH=$linux/lib/pkgconfig
version=$(pkg-config --modversion orvanesdk)
warnings="-Wall -Wextra -Wpedantic -Werror"

fail() { echo "FAILED: $*"; exit 1; }
# step NAME COMMAND...: runs COMMAND, its output kept in NAME.log and shown
# when it fails.
step() {
  local log=$1.log
  shift
  "$@" >>"$log" 2>&1 || { cat "$log"; fail "$*"; }
}
# read_back LOG WHAT: the log holds exactly an INIT and an ENTER record.
read_back() {
  local types
  types=$("$linux/bin/orvane-logcat" "$1" | grep -o '"type":"[A-Z]*"' | tr -d '\n')
  [ "$types" = '"type":"INIT""type":"ENTER"' ] || fail "$1 holds $types"
  echo "$2: first event recorded and read back"
}
# under_wine NAME EXE WHAT: the first event of a Windows game on a new C:\Orvane.
under_wine() {
  rm -rf "$WINEPREFIX/drive_c/Orvane"
  step "$1" bash "$here/../windows/wine_run.sh" "$WINEPREFIX" "$2"
  read_back "$WINEPREFIX/drive_c/Orvane/Logs/consumer.log" "$3"
}

step a cmake -S "$here" -B a -G Ninja -DCMAKE_PREFIX_PATH="$linux"
step a cmake --build a
[[ $(readelf -d a/consumer) =~ NEEDED[^$'\n']*\[libOrvaneSDK\.so\.1\] ]] || fail "a/consumer needs no libOrvaneSDK.so.1"
XDG_DATA_HOME=$PWD/a-data step a a/consumer
read_back a-data/Orvane/Logs/consumer.log "a (Linux, find_package)"

# shellcheck disable=SC2046 # pkg-config's flags are separate words
step b cc $warnings -DORVANE_EXPECTED_VERSION="\"$version\"" "$here/consumer.c" -o b-consumer \
  $(pkg-config --cflags --libs orvanesdk) -Wl,-rpath,"$(pkg-config --variable=libdir orvanesdk)"
XDG_DATA_HOME=$PWD/b-data step b ./b-consumer
read_back b-data/Orvane/Logs/consumer.log "b (Linux, pkg-config)"

wineboot -i </dev/null >/dev/null 2>&1
wineserver -w
trap 'wineserver -k >/dev/null 2>&1 || true' EXIT
wineserver -p </dev/null >/dev/null 2>&1

step c cmake -S "$here" -B c -G Ninja -DCMAKE_SYSTEM_NAME=Windows \
  -DCMAKE_C_COMPILER=x86_64-w64-mingw32-gcc-posix -DCMAKE_PREFIX_PATH="$windows"
step c cmake --build c
cp "$windows/bin/OrvaneSDK.dll" c/
under_wine c c/consumer.exe "c (mingw-w64, find_package, wine)"

# kernel32 comes from mingw-w64's import library, which lld-link reads too.
mkdir d && cp "$windows/bin/OrvaneSDK.dll" d/
step d clang --target=x86_64-pc-windows-msvc -ffreestanding $warnings -I"$windows/include" \
  -DORVANE_EXPECTED_VERSION="\"$version\"" -c "$here/consumer.c" -o d/consumer.obj
step d lld-link /nologo /entry:start /subsystem:console /nodefaultlib /out:d/consumer.exe \
  d/consumer.obj "$windows/lib/OrvaneSDK.lib" /usr/x86_64-w64-mingw32/lib/libkernel32.a
under_wine d d/consumer.exe "d (MSVC ABI, OrvaneSDK.lib, wine)"

[[ $(readelf -d "$linux/lib/libOrvaneSDK.so") =~ SONAME[^$'\n']*\[libOrvaneSDK\.so\.1\] ]] || fail "SONAME"
size=$(stat -c %s "$windows/bin/OrvaneSDK.dll")
[ "$size" -lt 400000 ] || fail "OrvaneSDK.dll is $size bytes"
for library in "$linux/lib/libOrvaneSDK.so" "$windows/bin/OrvaneSDK.dll"; do
  if ! gdb -batch -ex 'info line oAnalyticsGameEnter' -ex 'info line orvane::RecordEvent' "$library" >gdb.log 2>&1 ||
    [ "$(grep -cE 'of ".*/src/analytics/(exports_analytics|event_recorder)\.cpp"' gdb.log)" -ne 2 ]; then
    cat gdb.log
    fail "gdb finds no source lines of ours in $library"
  fi
done
echo "SONAME libOrvaneSDK.so.1; OrvaneSDK.dll $size bytes; gdb reads both symbols files"
