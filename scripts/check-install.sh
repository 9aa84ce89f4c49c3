#!/usr/bin/env bash
# Installs the build into a scratch prefix and builds a program outside the
# tree against it twice: with find_package(stbplat) and with pkg-config.
#   check-install.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$(cd "$1" && pwd)
src=$(cd "$2" && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
prefix=$work/prefix
cmake --install "$build" --prefix "$prefix" >/dev/null
consumer=$src/tests/install/consumer
# Nothing below may lean on the loader's search path, nor find the device or
# the preload library by the environment.
unset LD_LIBRARY_PATH STBPLAT_ROOT STBPLAT_MEMORY_MAP STBPLAT_HOSTSIM_LIBRARY
"$prefix/bin/stbplat" --help >/dev/null
"$prefix/bin/stbplat" --root "$src/examples/device" record show NOR0.BOOT.A >/dev/null
# The manual and the completion come with it, and name every command group.
groups=$("$prefix/bin/stbplat" --help | sed -n '/^Subcommands:/,$p' | awk 'NR > 1 {print $1}')
for group in $groups; do
  grep '^\.B' "$prefix/share/man/man1/stbplat.1" | sed 's/\\f[BRI]//g' | grep -qw -- "$group" || { echo "check-install: the manual lacks $group" >&2; exit 1; }
done
completion=$(bash -c 'source "$1"; COMP_WORDS=(stbplat fla); COMP_CWORD=1; PATH=$2:$PATH _stbplat; echo "${COMPREPLY[*]}"' \
  _ "$prefix/share/bash-completion/completions/stbplat" "$prefix/bin")
[ "$completion" = flash ] || { echo "check-install: completion of 'fla' gave '$completion'" >&2; exit 1; }

cmake -S "$consumer" -B "$work/cmake-build" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$work/cmake-build" >/dev/null
"$work/cmake-build/consumer"

libdir=$(ls -d "$prefix"/lib*/pkgconfig | head -n 1)
export PKG_CONFIG_PATH=$libdir
# shellcheck disable=SC2046
g++ -std=c++17 "$consumer/main.cpp" -o "$work/pc-consumer" $(pkg-config --cflags --libs stbplat)
"$work/pc-consumer"
# The README's example builds both ways too.
cmake -S "$src/examples/read-version" -B "$work/example-build" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$work/example-build" >/dev/null
# shellcheck disable=SC2046
g++ -std=c++17 "$src/examples/read-version/main.cpp" -o "$work/read-version" $(pkg-config --cflags --libs stbplat)
"$work/read-version" 2>/dev/null && { echo "check-install: read-version without arguments succeeded" >&2; exit 1; }
# A user's program runs on the example device through the installed preload library.
version=$("$prefix/bin/stbplat" --root "$src/examples/device" run -- "$work/read-version" NAND0 KERNEL A)
[ "$version" = 5.15a ] || { echo "check-install: stbplat run of read-version gave '$version'" >&2; exit 1; }
# One that rewrites a record changes a copy of it, and a second run reads what the first stored.
# shellcheck disable=SC2046
g++ -std=c++17 "$src/examples/rewrite-version/main.cpp" -o "$work/rewrite-version" $(pkg-config --cflags --libs stbplat)
cp -r "$src/examples/device" "$work/device"
for expected in "5.15a -> 5.16a" "5.16a -> 5.17a"; do
  got=$("$prefix/bin/stbplat" --root "$work/device" run -- "$work/rewrite-version" NAND0 KERNEL A)
  [ "$got" = "$expected" ] || { echo "check-install: stbplat run of rewrite-version gave '$got', not '$expected'" >&2; exit 1; }
done
echo "check-install: the installed tool ran; find_package and pkg-config consumers built and ran"
