#!/usr/bin/env bash
# Compares the dynamic symbols that a shared library defines with the
# checked-in list of its interface (every file in a folder, one demangled
# symbol a line). A renamed, retyped, missing or extra export fails.
#   check-exports.sh LIBRARY LIST_DIR [NM]
set -euo pipefail
lib=$1
list_dir=$2
nm_tool=${3:-nm}

expected=$(mktemp) actual=$(mktemp)
trap 'rm -f "$expected" "$actual"' EXIT

cat "$list_dir"/*.txt | sed -e 's/[[:space:]]*$//' -e '/^#/d' -e '/^$/d' | LC_ALL=C sort -u >"$expected"

# Demangled names of defined dynamic symbols, less the ELF/runtime symbols and
# the instantiations of standard-library templates that inline code emits,
# and the function-type typeinfo that UBSan's instrumentation adds.
"$nm_tool" -DC --defined-only "$lib" |
  sed -E 's/^[0-9a-fA-F]* +[A-Za-z] +//' |
  { grep -v -E '^(_init|_fini|_edata|_end|__bss_start)$' || true; } |
  { grep -v -E '^((std|__gnu_cxx)::|[^(]* (std|__gnu_cxx)::)' || true; } |
  { grep -v -E '^(typeinfo|typeinfo name|vtable|VTT|guard variable) for (std|__gnu_cxx)::' || true; } |
  { grep -v -E '^typeinfo (name )?for [^:]*\(' || true; } |
  LC_ALL=C sort -u >"$actual"

if ! diff -u --label expected --label "$lib" "$expected" "$actual"; then
  echo "check-exports: the exported symbols of $(basename "$lib") differ from $list_dir (- expected, + exported)" >&2
  exit 1
fi
echo "check-exports: $(wc -l <"$actual") symbols match"
