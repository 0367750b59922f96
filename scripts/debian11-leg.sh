#!/usr/bin/env bash
# The Debian 11 leg: the library of a normal Linux build, loaded by a host
# compiled on Debian 11 (glibc 2.31, OpenSSL 1.1 only), as a game on an older
# system or in a Debian 11 based game runtime loads it.
#   scripts/debian11-leg.sh [BUILD_DIR]     default build/ci; needs root
# The Debian 11 root is made with debootstrap once and kept in
# $ORVANE_BULLSEYE_ROOT (default /var/cache/orvane-bullseye-root) for later runs.
# Inside it the sample host (examples/host.c) is compiled and runs INIT and
# ENTER against BUILD_DIR's libOrvaneSDK.so with a launcher's command line;
# orvane-logcat of BUILD_DIR must read the log back, outside the root and in
# it. Then the same without any libcrypto.
set -euo pipefail
cd "$(dirname "$0")/.."
build="$(realpath "${1:-build/ci}")"
root="${ORVANE_BULLSEYE_ROOT:-/var/cache/orvane-bullseye-root}"
# What the root holds; a root made with another list is made again.
packages="gcc,libc6-dev,libssl1.1"
stamp="$root/.orvane-root-complete"

fail() {
  echo "debian11-leg: $*" >&2
  exit 1
}

# One run at a time per root; a /proc left mounted by a killed run goes first.
exec 9>"$root.lock"
flock 9
umount "$root/proc" 2>/dev/null || true

if [ "$(cat "$stamp" 2>/dev/null)" != "$packages" ]; then
  echo "Making the Debian 11 root in $root (once per machine)"
  started=$SECONDS
  rm -rf "$root"
  debootstrap --variant=minbase --include="$packages" bullseye "$root" >"$root.log" 2>&1 ||
    fail "debootstrap failed, see $root.log"
  echo "$packages" >"$stamp"
  echo "Root made in $((SECONDS - started)) s"
fi

[ -f "$root/usr/lib/x86_64-linux-gnu/libcrypto.so.1.1" ] || fail "the root has no libcrypto.so.1.1"
[ ! -e "$root/usr/lib/x86_64-linux-gnu/libcrypto.so.3" ] || fail "the root has libcrypto.so.3"
glibc="$(chroot "$root" getconf GNU_LIBC_VERSION)"
[ "$glibc" = "glibc 2.31" ] || fail "the root has $glibc, not glibc 2.31"

# A fresh work folder inside the root; /proc inside it, since the library reads
# the launcher's arguments from /proc/self/cmdline. Both go away on every exit.
work=/tmp/orvane-leg
rm -rf "${root:?}$work"
mkdir -p "$root$work/lib" "$root$work/include" "$root$work/data"
cleanup() {
  umount "$root/proc" 2>/dev/null || true
  rm -rf "${root:?}$work"
}
trap cleanup EXIT
mount -t proc proc "$root/proc"

cp -P "$build"/bin/libOrvaneSDK.so* "$root$work/lib/"
cp "$build/bin/orvane-logcat" "$root$work/"
cp include/OrvaneSDK.h "$build/include/OrvaneSDKVersion.h" "$root$work/include/"
cp examples/host.c "$root$work/"
inside() { chroot "$root" /usr/bin/env -i PATH=/usr/bin:/bin HOME=/root XDG_DATA_HOME="$work/data" "$@"; }

inside gcc -std=gnu11 -O2 -Wall -Werror -I"$work/include" "$work/host.c" -o "$work/host" -ldl
user=3f6c2a9e-41d7-4b8e-9a0c-5d1e7f2b8c44
game=bullseye-race
out="$(inside "$work/host" --library "$work/lib/libOrvaneSDK.so" init "$game" "$user" enter "$game" "$user" \
  uuid gameid -- --userUuid--"$user" --gameId--"$game")" || fail "the host failed:"$'\n'"$out"
echo "$out"
for expected in "oAnalyticsInit() = 0" "oAnalyticsGameEnter() = 0" "oAuthGetUserUuid() = \"$user\"" \
  "oAuthGetGameId() = \"$game\""; do
  grep -qxF "$expected" <<<"$out" || fail "the host did not print: $expected"
done

log="$root$work/data/Orvane/Logs/$game.log"
for reader in outside inside; do
  if [ $reader = outside ]; then
    records="$("$build/bin/orvane-logcat" "$log")"
  else
    records="$(inside "$work/orvane-logcat" "$work/data/Orvane/Logs/$game.log")"
  fi
  [ "$(grep -c . <<<"$records")" -eq 2 ] &&
    grep -q "\"user_id\":\"$user\",\"game_id\":\"$game\",\"type\":\"INIT\"" <<<"$records" &&
    grep -q "\"user_id\":\"$user\",\"game_id\":\"$game\",\"type\":\"ENTER\"" <<<"$records" ||
    fail "orvane-logcat ($reader) does not read INIT and ENTER back:"$'\n'"$records"
done
echo "$records"

# Neither OpenSSL (libcrypto.so.1.1 hidden in a mount namespace of its own):
# the library still loads and answers, and each event fails with its message.
out="$(unshare -m bash -c 'mount --bind /dev/null "$1/usr/lib/x86_64-linux-gnu/libcrypto.so.1.1" &&
  exec chroot "$1" /usr/bin/env -i PATH=/usr/bin:/bin XDG_DATA_HOME="$2/data" "$2/host" \
    --library "$2/lib/libOrvaneSDK.so" enter "$3" "$4" uuid -- --userUuid--"$4"' _ "$root" "$work" "$game" "$user")" &&
  fail "an event succeeded without libcrypto:"$'\n'"$out"
for expected in "  [2 ERROR] [OrvaneSDK] Analytics ENTER - failed. Record encryption failed." \
  "oAnalyticsGameEnter() = -1" "oAuthGetUserUuid() = \"$user\""; do
  grep -qxF "$expected" <<<"$out" || fail "without libcrypto, the host did not print: $expected"$'\n'"$out"
done
echo "Debian 11 ($glibc, libcrypto.so.1.1 only): the library loads, records and is read back;"
echo "without libcrypto it loads and its events fail with their message"
