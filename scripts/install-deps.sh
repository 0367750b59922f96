#!/usr/bin/env bash
# Installs the Debian packages that building and testing need, when missing.
# Usage: scripts/install-deps.sh [linux|all]
#   all adds mingw-w64, wine, clang, debootstrap (the Debian 11 leg), and for
#   the release archives and their consumer builds llvm (llvm-dlltool), lld
#   (lld-link), gdb and jq.
set -euo pipefail

# mono-mcs and mono-runtime compile and run the C# binding's tests; python3
# is the strict JSON parser of the log reader's tests; make is the build program
# that cmake picks when the docs' recipes name none.
packages=(cmake make ninja-build g++ pkg-config libssl-dev openssl libgtest-dev googletest libbenchmark-dev valgrind
  mono-mcs mono-runtime python3 abigail-tools)
if [ "${1:-all}" = all ]; then
  # wine answers the DLL's CNG calls with GnuTLS, a recommendation only; jq
  # runs in the README's log-reading recipe, which the package leg runs. love runs the LuaJIT binding's
  # tests; python3-venv and python3-wheel install the Python binding in the docs' recipe.
  packages+=(clang libclang-rt-14-dev g++-mingw-w64-x86-64-posix wine wine64 libgnutls30 llvm lld gdb jq
    debootstrap diffoscope-minimal love python3-venv python3-wheel)
fi

missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done
[ ${#missing[@]} -eq 0 ] && exit 0

sudo=""
[ "$(id -u)" -eq 0 ] || sudo="sudo"
echo "Installing: ${missing[*]}"
$sudo apt-get update -qq
DEBIAN_FRONTEND=noninteractive $sudo apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
