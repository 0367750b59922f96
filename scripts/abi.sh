#!/usr/bin/env bash
# The ABI that games of release 1.0 were built against, held in abi/, and a
# build's library compared with it. The baseline:
#   abi/libOrvaneSDK.so.abi      the .so's interface as libabigail reads it
#                                from the DWARF (the .debug beside a stripped
#                                library): each export, its parameter and
#                                return types and every type they reach,
#                                enum values included
#   abi/OrvaneSDK.h.constants    the public header's macros but the version's
#   abi/OrvaneSDK.dll.exports    the DLL's export table, by name
# Within one major version an export, a type or a constant may be added,
# never removed or changed (docs/releases.md says when the SONAME changes).
#   scripts/abi.sh check LIBRARY       fails on what LIBRARY lost or changed
#   scripts/abi.sh self-check LIBRARY  check, then proves it fails on a planted
#                                      removal and change and passes an addition
#   scripts/abi.sh update LIBRARY      writes the baseline from LIBRARY
# LIBRARY: a build's libOrvaneSDK.so.X.Y.Z or OrvaneSDK.dll, in BUILD/bin.
set -euo pipefail
root=$(cd "$(dirname "$0")/.." && pwd)
mode=$1 library=$2
generated=$(cd "$(dirname "$library")/../include" && pwd) # OrvaneSDKVersion.h of the build
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

describe() { # LIBRARY FOLDER: writes the files of the baseline that LIBRARY has
  mkdir -p "$2"
  case $1 in
  *.dll)
    x86_64-w64-mingw32-objdump -p "$1" |
      sed -n '/^\[Ordinal\/Name Pointer\] Table/,/^$/s/^\t\[ *[0-9]*\] //p' | sort >"$2/OrvaneSDK.dll.exports" ;;
  *)
    abidw --debug-info-dir "$(dirname "$1")" --headers-dir "$root/include" --headers-dir "$generated" \
      --exported-interfaces-only --drop-private-types --no-corpus-path --no-comp-dir-path --no-show-locs \
      --no-elf-needed --type-id-style hash --out-file "$2/libOrvaneSDK.so.abi" "$1"
    cc -dM -E -x c -I "$generated" "$root/include/OrvaneSDK.h" | grep '^#define ORVANE_' |
      grep -v -e '^#define ORVANE_SDK_VERSION_' -e '_H *$' | sort >"$2/OrvaneSDK.h.constants" ;;
  esac
}

compare() { # BASELINE NOW: reports what NOW lost or changed of BASELINE; false when anything
  local status=0 file name lost
  for file in "$2"/*; do
    name=${file##*/}
    case $name in
    *.abi)
      abidiff --no-added-syms "$1/$name" "$file" >"$work/abidiff" || { cat "$work/abidiff"; status=1; } ;;
    *)
      lost=$(comm -23 "$1/$name" "$file")
      [ -z "$lost" ] || { printf '%s: removed or changed:\n%s\n' "$name" "$lost"; status=1; } ;;
    esac
  done
  return $status
}

describe "$library" "$work/now"
case $mode in
update) cp "$work"/now/* "$root/abi/" ;;
check) compare "$root/abi" "$work/now" || { echo "FAILED: $library breaks the ABI of abi/"; exit 1; } ;;
self-check)
  compare "$root/abi" "$work/now" || { echo "FAILED: $library breaks the ABI of abi/"; exit 1; }
  # The same library without oGetVersion, and with an enum value and a
  # constant changed (ERROR 2 becomes 3): each must fail, while the
  # library itself, against the one without oGetVersion, adds it and passes.
  mkdir "$work/removed" "$work/changed"
  for file in "$work"/now/*; do
    sed "/elf-symbol name='oGetVersion'/d; /<function-decl name='oGetVersion'/,/<\/function-decl>/d; /^oGetVersion$/d" "$file" >"$work/removed/${file##*/}"
    sed "s/name='Error' value='2'/name='Error' value='3'/; s/^#define ORVANE_LOG_ERROR 2$/&1/" "$file" \
      >"$work/changed/${file##*/}"
  done
  for planted in removed changed; do
    diff -rq "$work/now" "$work/$planted" >/dev/null && continue # the DLL's table has no values
    if compare "$work/now" "$work/$planted" >"$work/report"; then
      echo "FAILED: the check passed a library with oGetVersion $planted"; exit 1
    fi
    grep -q -e oGetVersion -e Error -e ORVANE_LOG_ERROR "$work/report" ||
      { cat "$work/report"; echo "FAILED: the report on the $planted library names no change"; exit 1; }
  done
  compare "$work/removed" "$work/now" || { echo "FAILED: an added export fails the check"; exit 1; } ;;
*) echo "usage: abi.sh check|self-check|update LIBRARY" >&2; exit 2 ;;
esac
echo "abi: $library keeps the ABI of abi/"
