#!/bin/bash
# OrvaneSDK.dll checked from Linux: its tables and version resource, then a
# first event through orvane-host.exe under wine with the identity on a real
# command line, the log checked byte for byte and decrypted by openssl.
#   dll_under_wine.sh PREFIX HOST_EXE DLL OBJDUMP WINDRES VERSION
set -u
prefix=$1 host=$2 dll=$3 objdump=$4 windres=$5 version=$6
fail() { echo "FAILED: $*"; exit 1; }

table=$("$objdump" -p "$dll") || fail "$objdump cannot read $dll"
exports=$(sed -n '/^\[Ordinal\/Name Pointer\] Table/,/^$/s/^\t\[ *[0-9]*\] //p' <<<"$table" | xargs)
[ "$exports" = "oAnalyticsGameEnter oAnalyticsGameExit oAnalyticsInit oAnalyticsSpecial oAuthGetGameId \
oAuthGetUserUuid oFreeText oGetVersion oInitialize oRegisterForLogs" ] || fail "exports: $exports"
# Only system DLLs: a game ships OrvaneSDK.dll alone.
imports=$(sed -n 's/^\tDLL Name: //p' <<<"$table" | tr A-Z a-z | sort | xargs)
[ "$imports" = "bcrypt.dll kernel32.dll msvcrt.dll shell32.dll" ] || fail "imports: $imports"
resource=$("$windres" -i "$dll" -O rc)
product='"ProductName", "OrvaneSDK"'
[[ $resource == *"FILEVERSION ${version//./, }, 0"*$product*"\"ProductVersion\", \"$version\""* ]] ||
  fail "version resource: $resource"

rm -rf "$prefix/drive_c/Orvane"
output=$(bash "$(dirname "$0")/wine_run.sh" "$prefix" "$host" uuid gameid enter g1 u1 special g1 u1 \
  score=10 -- "--userUuid--a1b2 c3d4" "--gameId--space race") || fail "orvane-host.exe: $output"
[[ $output == *'oAuthGetUserUuid() = "a1b2 c3d4"'*'oAuthGetGameId() = "space race"'* ]] ||
  fail "identity: $output"
# CR LF between lines, none at the end, nothing else but hex digits.
log=$prefix/drive_c/Orvane/Logs/g1.log
[ "$(tr '\r\n' '<>' <"$log" | tr -d 0-9a-f)" = '<><>' ] || fail "$log: $(od -c "$log")"
# The key text "OrvaneLogKey-01g1", zeros to 80 bytes: key bytes 0-31, IV 64-79.
key=$(printf '%-64s' "$(printf OrvaneLogKey-01g1 | od -An -tx1 | tr -d ' \n')" | tr ' ' 0)
records=$(for hex in $(tr '\r' ' ' <"$log"); do
  tr a-f A-F <<<"$hex" | basenc --base16 -d | openssl enc -d -aes-256-cbc -K "$key" -iv "$(printf %032d 0)"
  echo; done | sed -E 's/"time":"[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9]{2}:[0-9]{2}:[0-9]{2}"/"time":"T"/')
[ "$records" = '{"user_id":"u1","game_id":"g1","type":"INIT","time":"T","extra":""}
{"user_id":"u1","game_id":"g1","type":"ENTER","time":"T","extra":""}
{"user_id":"u1","game_id":"g1","type":"SPECIAL","time":"T","extra":"score=10"}' ] || fail "records: $records"
