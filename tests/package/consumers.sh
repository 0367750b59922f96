#!/bin/bash
# The release archives as game teams take them, unpacked, and four tiny games
# built against them: a Linux find_package, b Linux pkg-config, c mingw-w64
# find_package, d MSVC ABI (clang + lld-link, OrvaneSDK.lib); c and d under wine.
# The archive's orvane-logcat reads each one's first event back; then gdb must
# find our source lines through the symbols archives.  consumers.sh PACKAGES WORK
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
packages=$(cd "$1" && pwd) # WORK/wineprefix is kept between runs
mkdir -p "$2" && cd "$2" && rm -rf run && mkdir -p run/b run/d
export WINEPREFIX=$PWD/wineprefix WINEDEBUG=-all
cd run
for archive in "$packages"/OrvaneSDK-*; do cmake -E tar xf "$archive"; done
linux=$(echo "$PWD"/OrvaneSDK-*-linux-*) windows=$(echo "$PWD"/OrvaneSDK-*-windows-*)
export PKG_CONFIG_PATH=$linux/lib/pkgconfig
flags=(-Wall -Wextra -Wpedantic -Werror "-DORVANE_EXPECTED_VERSION=\"$(pkg-config --modversion orvanesdk)\"")
fail() { echo "FAILED: $*"; exit 1; }
# run NAME COMMAND...: the output goes to NAME.log, shown when COMMAND fails.
run() { "${@:2}" >>"$1.log" 2>&1 || { cat "$1.log"; fail "${*:2}"; }; }
# first_event NAME DATA_DIR COMMAND...: the log COMMAND makes in DATA_DIR holds an INIT and an ENTER record.
first_event() {
  rm -rf "$2/Orvane" && run "$1" "${@:3}"
  types=$("$linux/bin/orvane-logcat" "$2/Orvane/Logs/consumer.log" | grep -o '"type":"[A-Z]*"' | tr -d '\n')
  [ "$types" = '"type":"INIT""type":"ENTER"' ] || fail "$1: the log holds $types"
  echo "$1: first event recorded and read back"
}

run a cmake -S "$here" -B a -G Ninja -DCMAKE_PREFIX_PATH="$linux"
run a cmake --build a
[[ $(readelf -d a/consumer) == *'(NEEDED)'*'[libOrvaneSDK.so.1]'* ]] || fail "a/consumer needs no libOrvaneSDK.so.1"
XDG_DATA_HOME=$PWD/a first_event a "$PWD/a" a/consumer
# shellcheck disable=SC2046 # pkg-config's flags are separate words
run b cc "${flags[@]}" "$here/consumer.c" -o b/consumer $(pkg-config --cflags --libs orvanesdk) \
  -Wl,-rpath,"$(pkg-config --variable=libdir orvanesdk)"
XDG_DATA_HOME=$PWD/b first_event b "$PWD/b" b/consumer
run c cmake -S "$here" -B c -G Ninja -DCMAKE_SYSTEM_NAME=Windows \
  -DCMAKE_C_COMPILER=x86_64-w64-mingw32-gcc-posix -DCMAKE_PREFIX_PATH="$windows"
run c cmake --build c
# kernel32 and msvcrt come from mingw-w64's import libraries, which lld-link reads too.
run d clang --target=x86_64-pc-windows-msvc -ffreestanding "${flags[@]}" -I"$windows/include" \
  -c "$here/consumer.c" -o d/consumer.obj
run d lld-link /nologo /entry:start /subsystem:console /nodefaultlib /out:d/consumer.exe d/consumer.obj \
  "$windows/lib/OrvaneSDK.lib" /usr/x86_64-w64-mingw32/lib/lib{kernel32,msvcrt}.a
# The prefix is made and written out (wineserver -w) before a game runs in it.
wineboot -i </dev/null >/dev/null 2>&1 && wineserver -w
trap 'wineserver -k >/dev/null 2>&1 || true' EXIT
wineserver -p </dev/null >/dev/null 2>&1
for game in c d; do
  cp "$windows/bin/OrvaneSDK.dll" $game/
  first_event $game "$WINEPREFIX/drive_c" bash "$here/../windows/wine_run.sh" "$WINEPREFIX" $game/consumer.exe
done

[ "$(stat -c %s "$windows/bin/OrvaneSDK.dll")" -lt 400000 ] || fail "OrvaneSDK.dll is not stripped"
for library in "$linux/lib/libOrvaneSDK.so" "$windows/bin/OrvaneSDK.dll"; do
  gdb -batch -ex 'info line oAnalyticsGameEnter' -ex 'info line orvane::RecordEvent' "$library" >gdb.log 2>&1 || true
  [ "$(grep -cE 'of ".*/src/(api/exports_analytics|analytics/event_recorder)\.cpp"' gdb.log)" = 2 ] ||
    { cat gdb.log; fail "gdb finds no source lines of ours in $library"; }
done
