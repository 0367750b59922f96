#!/bin/bash
# A game's first event on a machine without C:\Orvane, through orvane-host.exe
# under wine; then the file is checked byte for byte from Linux and its lines
# decrypted with the openssl tool, independently of the library and of CNG.
#
#   first_event_under_wine.sh WINE_RUN PREFIX HOST_EXE
set -u
wine_run=$1 prefix=$2 host=$3
logs=$prefix/drive_c/Orvane/Logs
log=$logs/g1.log
failures=0
fail() {
  echo "FAILED: $*"
  failures=$((failures + 1))
}

rm -rf "$prefix/drive_c/Orvane"
output=$(bash "$wine_run" "$prefix" "$host" enter g1 u1 init g1 u1 special g1 u1 score=10)
status=$?
expected='oRegisterForLogs(print_message)
  [0 INFO] [OrvaneSDK] Logging initiated.
  [0 INFO] [OrvaneSDK] Analytics ENTER - SDK was never initialized. Initializing the SDK.
  [0 INFO] [OrvaneSDK] Initialize() - OK.
  [1 WARNING] [OrvaneSDK] Analytics ENTER - log was never initialized. Initialized the game log
  [0 INFO] [OrvaneSDK] Analytics INIT - OK
  [0 INFO] [OrvaneSDK] Analytics ENTER - OK
oAnalyticsGameEnter() = 0
  [1 WARNING] [OrvaneSDK] Analytics INIT - log had been already initialized.
oAnalyticsInit() = 0
  [0 INFO] [OrvaneSDK] Analytics SPECIAL - OK
oAnalyticsSpecial() = 0'
[ "$status" -eq 0 ] || fail "orvane-host.exe exited with $status"
[ "$output" = "$expected" ] || fail "host output differs:
$output"
[ -d "$logs" ] || fail "no directory drive_c/Orvane/Logs"
[ -f "$log" ] || { fail "no file drive_c/Orvane/Logs/g1.log"; exit 1; }

# Three lines: CR LF between them, none at the end, nothing but hex digits.
crlf=$(grep -c $'\r$' "$log")
lines=$(tr -d '\r' <"$log" | grep -c '')
[ "$crlf" -eq 2 ] || fail "expected 2 CR LF breaks, found $crlf"
[ "$lines" -eq 3 ] || fail "expected 3 lines, found $lines"
[ "$(tail -c 1 "$log" | od -An -c | tr -d ' ')" != '\n' ] || fail "line break at the end"
[ "$(tr -d '\r\n0-9a-f' <"$log" | wc -c)" -eq 0 ] || fail "bytes other than hex digits and line breaks"
[ "$(tr -cd '\r' <"$log" | wc -c)" -eq "$(tr -cd '\n' <"$log" | wc -c)" ] || fail "lone CR or LF"

# Key: "OrvaneLogKey-01" + "g1", zero-filled to 32 bytes; IV: bytes 64-79, zero.
key=$(printf 'OrvaneLogKey-01g1' | od -An -tx1 | tr -d ' \n')
while [ ${#key} -lt 64 ]; do key=${key}00; done
iv=00000000000000000000000000000000
types=()
while IFS= read -r hex || [ -n "$hex" ]; do
  hex=${hex%$'\r'}
  record=$(printf "$(printf '%s' "$hex" | sed 's/../\\x&/g')" |
    openssl enc -d -aes-256-cbc -K "$key" -iv "$iv")
  pattern='^\{"user_id":"u1","game_id":"g1","type":"([A-Z]+)","time":"[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9]{2}:[0-9]{2}:[0-9]{2}","extra":"(.*)"\}$'
  if [[ $record =~ $pattern ]]; then
    types+=("${BASH_REMATCH[1]}:${BASH_REMATCH[2]}")
  else
    fail "record does not decrypt to its text: '$record'"
  fi
done <"$log"
[ "${types[*]}" = "INIT: ENTER: SPECIAL:score=10" ] || fail "records: ${types[*]}"

[ "$failures" -eq 0 ] && echo "g1.log: 3 records, CR LF between lines, decrypted with openssl"
[ "$failures" -eq 0 ]
