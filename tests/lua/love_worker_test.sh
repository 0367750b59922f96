#!/bin/bash
# The LuaJIT binding in LÖVE 11, headless, as a game ships it (main.lua, orvane.lua and the library in
# one folder): 20 runs of the worker game, each on a new log.  love_worker_test.sh LIBRARY LOGCAT
set -euo pipefail
command -v love >/dev/null || { echo "MISSING love: the LuaJIT binding is not tested"; exit 77; }
here=$(cd "$(dirname "$0")" && pwd) game=$(mktemp -d)
trap 'rm -rf "$game"' EXIT
cp "$here"/game/*.lua "$here/../../bindings/lua/orvane.lua" "$game/" && cp "$1" "$game/libOrvaneSDK.so.1"
for run in $(seq 20); do
  rm -rf "$game/data" && mkdir -p "$game/data/runtime" && chmod 700 "$game/data/runtime"
  XDG_DATA_HOME=$game/data XDG_RUNTIME_DIR=$game/data/runtime ORVANE_LOGCAT=$2 \
    love "$game" --userUuid--3f6c-ünï --gameId--space-race || { echo "run $run failed ($?)"; exit 1; }
done
echo "love: 20 runs, 500 worker events each, every message and record there"
