#!/bin/sh
# Instructions, heap allocations and resident memory of one event.
#
#   bench/callgrind.sh [BUILD_DIR]
#
# BUILD_DIR is a build configured with -DORVANE_BUILD_BENCH=ON (default:
# build/default). Only the driver orvane-bench-events is built. Instructions
# and allocations per event are the difference between runs of 11,000 and
# 1,000 ENTER events divided by 10,000, so that start-up, the first event's
# directory work and the key schedule drop out. Resident memory is sampled
# around 1,000,000 events after a warm-up.
set -eu

here=$(cd "$(dirname "$0")" && pwd)
build=${1:-$here/../build/default}
small=1000
large=11000
memory_events=1000000

command -v valgrind >/dev/null || { echo "callgrind.sh: valgrind is not installed" >&2; exit 1; }
cmake --build "$build" --target orvane-bench-events >/dev/null
driver=$build/bin/orvane-bench-events
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Instructions executed in user space ("Collected" of the Ir event).
instructions() {
  valgrind --tool=callgrind --callgrind-out-file="$work/callgrind.out" "$driver" "$1" \
    2>"$work/callgrind.log"
  sed -n 's/.*Collected : \([0-9]*\).*/\1/p' "$work/callgrind.log"
}

# Heap blocks allocated over the whole run, C++ and C (OpenSSL) alike.
allocations() {
  valgrind --tool=memcheck --leak-check=no "$driver" "$1" 2>"$work/memcheck.log"
  sed -n 's/.*total heap usage: \([0-9,]*\) allocs.*/\1/p' "$work/memcheck.log" | tr -d ,
}

ir_small=$(instructions $small)
ir_large=$(instructions $large)
alloc_small=$(allocations $small)
alloc_large=$(allocations $large)
events=$((large - small))

echo "instructions: $ir_small for $small events, $ir_large for $large events"
echo "instructions per event: $(((ir_large - ir_small) / events))"
echo "heap allocations per event: $(awk "BEGIN { printf \"%.3f\", ($alloc_large - $alloc_small) / $events }")"
"$driver" --rss $memory_events
