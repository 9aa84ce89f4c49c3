#!/usr/bin/env bash
# Installs the Debian packages that building and testing need, when missing.
# Usage: deps.sh [group...]   groups: build (default), system, cross, tools,
#                              system-arm64, bench
set -euo pipefail
groups=("${@:-build}")
want=()
for g in "${groups[@]}"; do
  case "$g" in
    build)  want+=(cmake ninja-build g++ clang libgtest-dev libgmock-dev libbenchmark-dev zlib1g-dev pkg-config libclang-rt-14-dev) ;;
    tools)  want+=(libcli11-dev nlohmann-json3-dev) ;;
    bench)  want+=(time) ;;
    system) want+=(qemu-system-x86 linux-image-amd64 busybox-static mtd-utils smartmontools hdparm cpio kmod xz-utils) ;;
    cross)  want+=(g++-aarch64-linux-gnu binutils-aarch64-linux-gnu qemu-user googletest) ;;
    system-arm64) want+=(qemu-system-arm make xz-utils kmod cpio) ;;
    *) echo "deps.sh: unknown group $g" >&2; exit 2 ;;
  esac
done
missing=()
for p in "${want[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q 'install ok installed' || missing+=("$p")
done
[ ${#missing[@]} -eq 0 ] && exit 0
echo "deps.sh: installing ${missing[*]}"
SUDO=""; [ "$(id -u)" -ne 0 ] && SUDO=sudo
export DEBIAN_FRONTEND=noninteractive
# Another build on this machine may hold the package lock: wait for it.
LOCK=(-o DPkg::Lock::Timeout=600)
$SUDO apt-get "${LOCK[@]}" update -qq
$SUDO apt-get "${LOCK[@]}" install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
