#!/usr/bin/env bash
# Regenerates the bundled example device (examples/device) with
# stbplat-mkexample, which builds every record with the library itself.
#   examples/make-device.sh [BUILD_DIR]
set -euo pipefail
cd "$(dirname "$0")/.."
build=${1:-build/default}
cmake --build "$build" --target stbplat_mkexample >/dev/null
rm -rf examples/device.new
"$build/tools/stbplat-mkexample" examples/device.new
cp examples/device/README.md examples/device.new/ 2>/dev/null || true
rm -rf examples/device
mv examples/device.new examples/device
echo "examples/device written"
