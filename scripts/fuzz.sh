#!/usr/bin/env bash
# Builds the fuzz preset and runs each libFuzzer target for a bounded time,
# starting from its seed corpus. Any crash, leak, timeout or sanitizer report
# fails the run; the input that caused it is kept under the build directory.
#   scripts/fuzz.sh [SECONDS]     seconds per target, default 30
# ORVANE_FUZZ_BUILD_DIR overrides the build directory (default build/fuzz).
set -euo pipefail
cd "$(dirname "$0")/.."
seconds="${1:-30}"
build="${ORVANE_FUZZ_BUILD_DIR:-build/fuzz}"

cmake --preset fuzz -B "$build" >/dev/null
cmake --build "$build" -j 2

# New inputs go to a scratch corpus; the seeds in the repository stay as they are.
work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT
artifacts="$build/fuzz-artifacts"
mkdir -p "$artifacts"
export ASAN_OPTIONS="detect_leaks=1:abort_on_error=1:${ASAN_OPTIONS:-}"
export UBSAN_OPTIONS="print_stacktrace=1:halt_on_error=1:${UBSAN_OPTIONS:-}"

for target in record line; do
  printf '\n==== %s_fuzzer, %s s ====\n' "$target" "$seconds"
  mkdir -p "$work/$target"
  # libFuzzer reports every new input; keep that in a file and show the
  # summary, or the end of the report when the target failed.
  log="$build/${target}_fuzzer.log"
  if ! "$build/bin/${target}_fuzzer" \
      -max_total_time="$seconds" -rss_limit_mb=1024 -timeout=10 -print_final_stats=1 \
      -artifact_prefix="$artifacts/${target}-" \
      "$work/$target" "fuzz/corpus/$target" >"$log" 2>&1; then
    tail -n 60 "$log"
    echo "${target}_fuzzer failed; the input is in $artifacts" >&2
    exit 1
  fi
  grep -E '^(Done|stat::number_of_executed_units|stat::average_exec_per_sec|stat::peak_rss_mb)' "$log"
done
