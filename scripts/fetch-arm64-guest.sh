#!/usr/bin/env bash
# Unpacks what an AArch64 system-test guest needs from Debian's arm64
# packages into a directory (never installed on the host): the kernel with
# its modules, busybox, mtd-utils, hdparm, smartctl and the libraries these
# load. The kernel package follows linux-image-arm64.
# Usage: fetch-arm64-guest.sh DEST        (prints the kernel version)
set -euo pipefail
dest=$1
SUDO=""; [ "$(id -u)" -ne 0 ] && SUDO=sudo
export DEBIAN_FRONTEND=noninteractive

if ! dpkg --print-foreign-architectures | grep -qx arm64; then
  $SUDO dpkg --add-architecture arm64
  $SUDO apt-get update -qq
fi
if ! apt-cache show linux-image-arm64:arm64 >/dev/null 2>&1; then
  $SUDO apt-get update -qq
fi
kpkg=$(apt-cache depends linux-image-arm64:arm64 | awk '/Depends: linux-image-/{print $2; exit}')
kpkg=${kpkg%:arm64}
[ -n "$kpkg" ] || { echo "fetch-arm64-guest.sh: no arm64 kernel package" >&2; exit 2; }

# The programs, and the shared libraries they need that the cross
# toolchain's sysroot does not carry.
pkgs=("$kpkg" busybox-static mtd-utils hdparm smartmontools
      libiniparser1 liblzo2-2 libselinux1 libpcre2-8-0 libssl3 libuuid1 libzstd1 zlib1g
      libcap-ng0 libsystemd0 libcap2 libgcrypt20 libgpg-error0 liblz4-1 liblzma5)
stamp="$dest/.packages"
want="${pkgs[*]}"
if [ -f "$stamp" ] && [ "$(cat "$stamp")" = "$want" ]; then
  echo "${kpkg#linux-image-}"
  exit 0
fi
rm -rf "$dest"
mkdir -p "$dest/debs" "$dest/root"
(cd "$dest/debs" && apt-get download -qq $(printf '%s:arm64 ' "${pkgs[@]}")) >&2
for deb in "$dest"/debs/*.deb; do dpkg-deb -x "$deb" "$dest/root"; done
rm -rf "$dest/debs"
echo "$want" >"$stamp"
echo "${kpkg#linux-image-}"
