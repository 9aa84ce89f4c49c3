#!/usr/bin/env bash
# Builds the kernel's flash simulators (the raw NAND core with nandsim, and
# mtdram) as modules for a Debian kernel whose configuration leaves them out
# (arm64's), from Debian's own kernel source and headers packages, with
# tests/system/kmod/Kbuild. The modules go to <root>/lib/modules/<kver>/extra.
# Usage: build-flash-modules.sh ROOT KVER ARCH CROSS_TRIPLE
set -euo pipefail
root=$1 kver=$2 arch=$3 triple=$4
here=$(cd "$(dirname "$0")/.." && pwd)
out="$root/lib/modules/$kver/extra"
[ -f "$out/nandsim.ko" ] && exit 0
work=$(dirname "$root")/flash-modules
rm -rf "$work"
mkdir -p "$work/debs" "$work/tree" "$work/mod"

hdr=linux-headers-$kver
# The common headers and kbuild (its programs run here, so the build
# machine's own architecture) of the same kernel, and its source.
depends=$(apt-cache depends "$hdr:$arch")
common=$(grep -o 'linux-headers-[^ :>]*-common' <<<"$depends" | head -1)
kbuild=$(grep -o 'linux-kbuild-[0-9.]*' <<<"$depends" | head -1)
version=$(apt-cache show "$hdr:$arch" | awk '/^Version:/{print $2; exit}')
series=${kbuild#linux-kbuild-}
(cd "$work/debs" && apt-get download -qq "$hdr:$arch" "$common" "$kbuild=$version" \
   "linux-source-$series=$version") >&2
for deb in "$work"/debs/*.deb; do dpkg-deb -x "$deb" "$work/tree"; done
headers="$work/tree/usr/src/$hdr"
# The headers' Makefile names the common tree by its installed path.
echo "include $work/tree/usr/src/$common/Makefile" >"$headers/Makefile"

src=linux-source-$series
tar -xJf "$work/tree/usr/src/$src.tar.xz" -C "$work" \
  --wildcards "$src/drivers/mtd/nand/raw/*" "$src/drivers/mtd/nand/ecc-sw-hamming.c" \
  "$src/drivers/mtd/devices/mtdram.c"
cp "$work/$src"/drivers/mtd/nand/raw/*.c "$work/$src"/drivers/mtd/nand/raw/internals.h \
   "$work/$src/drivers/mtd/nand/ecc-sw-hamming.c" "$work/$src/drivers/mtd/devices/mtdram.c" \
   "$here/tests/system/kmod/Kbuild" "$work/mod/"
make -s -C "$headers" M="$work/mod" ARCH="$arch" CROSS_COMPILE="$triple-" \
  DEB_BUILD_ARCH="$(dpkg --print-architecture)" DEB_HOST_ARCH="$arch" DEB_HOST_GNU_TYPE="$triple" \
  -j2 modules >&2
mkdir -p "$out"
cp "$work"/mod/{nand,nandsim,mtdram}.ko "$out/"
rm -f "$root/lib/modules/$kver/modules.dep"
rm -rf "$work"
