#!/bin/bash
# Four processes of four threads each record on one log under wine, which
# turns an append into a seek and a write; every call returns 0 and every
# record is then in the log, whole on a line of its own, behind one INIT.
#   shared_log_under_wine.sh PREFIX WRITER_EXE EVENTS
set -u
prefix=$1 writer=$2 events=$3
fail() { echo "FAILED: $*"; exit 1; }
rm -rf "$prefix/drive_c/Orvane"
for p in 0 1 2 3; do bash "$(dirname "$0")/wine_run.sh" "$prefix" "$writer" $p "$events" & done
for p in 0 1 2 3; do wait -n || fail "a writer's call failed"; done
log=$prefix/drive_c/Orvane/Logs/g1.log
key=$(printf '%-64s' "$(printf OrvaneLogKey-01g1 | od -An -tx1 | tr -d ' \n')" | tr ' ' 0)
records=$(tr '\r' '\n' <"$log" | grep . | while read -r hex; do
  tr a-f A-F <<<"$hex" | basenc --base16 -d | openssl enc -d -aes-256-cbc -K "$key" -iv "$(printf %032d 0)" ||
    echo torn; echo; done | sed -nE 's/.*"type":"([A-Z]*)".*"extra":"([^"]*)".*/\1 \2/p;/^torn/p')
expected=$(echo "INIT "; for p in 0 1 2 3; do for t in 0 1 2 3; do for ((n = 0; n < events; ++n)); do
  echo "SPECIAL p$p t$t n$n"; done; done; done)
[ "$(head -n1 <<<"$records")" = "INIT " ] || fail "the log does not start with INIT: $(head -n3 <<<"$records")"
diff <(sort <<<"$records") <(sort <<<"$expected") >/dev/null ||
  fail "records: $(diff <(sort <<<"$records") <(sort <<<"$expected") | head)"
