#!/usr/bin/env bash
# Builds the library, records a demo game session with the sample host, and
# reads the encrypted log back with orvane-logcat.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh linux
cmake --preset default -DORVANE_BUILD_TESTS=OFF >/dev/null
cmake --build --preset default -j 2 --target OrvaneSDK orvane-host orvane-logcat >/dev/null

# The demo keeps its files inside the build tree instead of ~/.local/share.
export XDG_DATA_HOME="$PWD/build/demo-data"
rm -rf "$XDG_DATA_HOME"
mkdir -p "$XDG_DATA_HOME"
bin=build/default/bin

echo "== orvane-host: a game session, launched as a launcher would"
"$bin/orvane-host" -- --userUuid--3f6c2a9e-41d7-4b8e-9a0c-5d1e7f2b8c44 --gameId--space-race

log="$XDG_DATA_HOME/Orvane/Logs/space-race.log"
echo
echo "== $log (encrypted, one line per event)"
# Every record starts with the same bytes under the same key and IV, so the
# lines' first blocks agree; their ends show them apart.
awk '{ printf "%d: %4d hex digits  %s...%s\n", NR, length($0), substr($0, 1, 24), substr($0, length($0) - 39) }' "$log"
echo
echo "== orvane-logcat $log"
"$bin/orvane-logcat" "$log"
