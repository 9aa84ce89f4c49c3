#!/usr/bin/env bash
# Fails when library code calls a device- or file-touching C library function
# directly instead of through the OS seam (src/os/seam.cpp is the only place
# allowed to name them).
#   check-seam.sh SOURCE_ROOT
set -euo pipefail
root=$1
calls='open|open64|close|lseek|lseek64|read|write|pread|pwrite|ioctl|fopen|fopen64|fclose|fread|fwrite|fseek|fseeko|ftell|ftello|fgets|popen|pclose|mmap|mmap64|munmap|readlink|unlink|remove|getpagesize|sleep|stat|access|opendir'
# A direct call is the bare name (or ::name / std::name) followed by '(' and
# not reached as a member of the seam table (Sys().name, calls.name, ->name).
pattern="(^|[^A-Za-z0-9_.>])(::|std::)?(${calls})[[:space:]]*\\("
hits=$(cd "$root" && grep -rn -E "$pattern" src --include='*.cpp' --include='*.h' |
       grep -v -E '^src/os/seam\.(cpp|h):' |
       grep -v -E '^[^:]*:[0-9]+:[[:space:]]*(//|\*)' || true)
if [ -n "$hits" ]; then
  echo "check-seam: device-touching calls outside the OS seam:" >&2
  echo "$hits" >&2
  exit 1
fi
echo "check-seam: no direct device calls outside src/os/seam.cpp"
