#!/bin/bash
# The release archives as game teams take them, unpacked, and the recipes of the README and docs/ run
# against them exactly as written, in an environment as bare as a reader's (env -i: a PATH and a HOME,
# no CMAKE_GENERATOR): each block after a line `<!-- recipe: NAME -->` becomes the file NAME; every
# relative link and anchor of the docs must resolve (scripts/check-links.py); the *.sh ones run in the folder of the archives (CMake on Linux and cross-built for Windows with an
# ordinary toolchain file, pkg-config, C# under mono); then the SDK folders are moved away and run.sh
# starts every game (the Windows one under wine), read-logs.sh reads what they recorded. Beside the
# recipes: an MSVC-ABI game (clang + lld-link, OrvaneSDK.lib) under wine, the Unity package of each
# archive, no build templates, stripped binaries, and symbols that name no folder of the build machine
# yet let gdb list our sources.  consumers.sh PACKAGES WORK
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd) root=$(cd "$(dirname "$0")/../.." && pwd)
packages=$(cd "$1" && pwd) # WORK/wineprefix is kept between runs
mkdir -p "$2" && cd "$2" && rm -rf run away home/.local/share/Orvane && mkdir -p run/d away home
home=$PWD/home # home/.wine is kept between runs
export WINEPREFIX=$home/.wine WINEDEBUG=-all
cd run
for archive in "$packages"/OrvaneSDK-*; do cmake -E tar xf "$archive"; done
linux=$(echo "$PWD"/OrvaneSDK-*-linux-*) windows=$(echo "$PWD"/OrvaneSDK-*-windows-*)
fail() { echo "FAILED: $*"; exit 1; }
# run NAME COMMAND...: the output goes to NAME.log, shown when COMMAND fails.
run() { "${@:2}" >>"$1.log" 2>&1 </dev/null || { cat "$1.log"; fail "${*:2}"; }; }
# recipe NAME: the recipe NAME.sh as a reader runs it, with nothing of this script's environment.
recipe() { run "$1" env -i PATH=/usr/local/bin:/usr/bin:/bin HOME="$home" LANG=C.UTF-8 bash -eu "$1.sh"; }
# types LOG: the types of LOG's records, read by the archive's orvane-logcat, as one word.
types() { "$linux/bin/orvane-logcat" "$1" | grep -o '"type":"[A-Z]*"' | tr -d '\n'; }

awk '/^<!-- recipe: .* -->$/ { name = $3; system("mkdir -p $(dirname " name ")"); next }
     name && /^```/ { if (open) name = ""; open = !open; next }
     open { print > name }' "$root/README.md" "$root"/docs/*.md
python3 "$root/scripts/check-links.py" "$root" || fail "the docs hold links that lead nowhere"
wineboot -i </dev/null >/dev/null 2>&1 && wineserver -w # the prefix is made and written out first
trap 'wineserver -k >/dev/null 2>&1 || true' EXIT
wineserver -p </dev/null >/dev/null 2>&1
for name in linux-cmake windows-cmake pkg-config csharp python lua; do recipe $name; done
for game in build-linux/game build-pc/game; do # the loader looks in the game's folder only
  [ "$(readelf -d $game | sed -n 's/.*(RUNPATH).*\[\(.*\)\]/\1/p')" = '$ORIGIN' ] || fail "$game: RUNPATH"
done
mv "$linux" "$windows" ../away/
rm -rf "$WINEPREFIX/drive_c/Orvane" && recipe run
mv ../away/* .
recipe read-logs && recipe decode-log
session='"type":"INIT""type":"ENTER""type":"SPECIAL"' next='"type":"ENTER""type":"SPECIAL"'
[ "$(types "$home/.local/share/Orvane/Logs/space-race.log")" = "$session$next$next" ] ||
  fail "the Linux games' log holds $(types "$home/.local/share/Orvane/Logs/space-race.log")"
[ "$(types "$WINEPREFIX/drive_c/Orvane/Logs/space-race.log")" = "$session" ] || fail "the Windows game's log"
[ "$(grep -c ' 3f6c2a9e-41d7-4b8e-9a0c-5d1e7f2b8c44 level=3$' read-logs.log)" = 3 ] || fail "read-logs.sh"
grep -o 'OrvaneSDK-[^ ]*' msvc.bat | while read -r path; do
  [ -e "${path//\\//}" ] || fail "msvc.bat: no $path"
done
version=$(PKG_CONFIG_PATH=$linux/lib/pkgconfig pkg-config --modversion orvanesdk)

# kernel32 and msvcrt come from mingw-w64's import libraries, which lld-link reads too.
run d clang --target=x86_64-pc-windows-msvc -ffreestanding -Wall -Wextra -Wpedantic -Werror \
  "-DORVANE_EXPECTED_VERSION=\"$version\"" -I"$windows/include" -c "$here/consumer.c" -o d/consumer.obj
run d lld-link /nologo /entry:start /subsystem:console /nodefaultlib /out:d/consumer.exe d/consumer.obj \
  "$windows/lib/OrvaneSDK.lib" /usr/x86_64-w64-mingw32/lib/lib{kernel32,msvcrt}.a
cp "$windows/bin/OrvaneSDK.dll" d/
rm -rf "$WINEPREFIX/drive_c/Orvane" && run d bash "$here/../windows/wine_run.sh" "$WINEPREFIX" d/consumer.exe
[ "$(types "$WINEPREFIX/drive_c/Orvane/Logs/consumer.log")" = '"type":"INIT""type":"ENTER"' ] ||
  fail "d's log"

[ "$(stat -c %s "$windows/bin/OrvaneSDK.dll")" -lt 400000 ] || fail "OrvaneSDK.dll is not stripped"
[ -z "$(find "$linux" "$windows" -name CMakeLists.txt -o -name '*.in')" ] || fail "build templates shipped"
[ -e "$windows/docs/events.md" ] && [ -e "$linux/share/doc/OrvaneSDK/docs/events.md" ] &&
  [ -z "$(find "$linux" "$windows" -name CONTRIBUTING.md)" ] || fail "the archives ship not the user pages alone"
! grep -rlaF "$root" "$linux" "$windows" || fail "these files name the folder the release was built in"
for library in "$linux/lib/libOrvaneSDK.so" "$windows/bin/OrvaneSDK.dll"; do
  gdb -batch -ex "set substitute-path /usr/src/orvanesdk-$version $root" -ex 'list oAnalyticsGameEnter' \
    -ex 'info line orvane::RecordEvent' "$library" >gdb.log 2>&1 || true
  if ! grep -q 'oAnalyticsGameEnter(const char \*gameId' gdb.log ||
    ! grep -q "of \"/usr/src/orvanesdk-$version/src/analytics/event_recorder.cpp\"" gdb.log; then
    cat gdb.log
    fail "gdb lists no sources of ours for $library"
  fi
done
# The PDB beside each Windows binary is the one its debug directory names (GUID, age, no folder), with
# public symbols and a function of ours whose lines begin at its address, as a Windows debugger reads them.
pdb_matches() { # BINARY FUNCTION SOURCE
  local pdb=${1%.*}.pdb directory b address
  directory=$(llvm-readobj --coff-debug-directory "$1")
  read -ra b <<<"$(sed -n 's/.*PDBGUID: (\(.*\))/\1/p' <<<"$directory")"
  local guid="${b[3]}${b[2]}${b[1]}${b[0]}-${b[5]}${b[4]}-${b[7]}${b[6]}-${b[8]}${b[9]}-$(printf %s "${b[@]:10}")"
  [[ $directory == *"PDBAge: 1"*"PDBFileName: ${pdb##*/}"* ]] &&
    [[ $(llvm-pdbutil dump -summary "$pdb") == *"Age: 1"*"GUID: {$guid}"* ]] || return 1
  llvm-pdbutil dump -publics "$pdb" | grep "S_PUB32 .*\`$2\`" >/dev/null || return 1
  address=$(llvm-pdbutil dump -symbols "$pdb" | grep -A1 "S_GPROC32 .*\`$2\`" |
    sed -n 's/.*addr = \([0-9]*\):\([0-9]*\),.*/\1 \2/p')
  llvm-pdbutil dump -l "$pdb" | awk -v source="/usr/src/orvanesdk-$version/$3 " \
    -v start="$(printf '%04X:%08X-' $address)" 'index($0, source) == 1 { in_source = 1; next }
    /^\// { in_source = 0 } in_source && index($0, "  " start) == 1 { found = 1 } END { exit !found }'
}
pdb_matches "$windows/bin/OrvaneSDK.dll" oAnalyticsGameEnter src/api/exports_analytics.cpp || fail "OrvaneSDK.pdb"
pdb_matches "$windows/bin/orvane-logcat.exe" main tools/logcat/main.cpp || fail "orvane-logcat.pdb"
echo "package: every recipe ran; the games recorded after the SDK folders were moved away"
