#!/usr/bin/env bash
# Compares the dynamic symbols that a shared library defines with the
# checked-in list of its interface (every file in a folder, one demangled
# symbol a line). A renamed, retyped, missing or extra export fails.
# With the platform library and the list of what may be taken from it, also
# checks the library's imports from the platform library against that list
# (names without parameters), so that it loads beside the device's own. In a
# build with UBSan ("sanitized"), the type information its checks of virtual
# calls take is left out: the device build has no such instrumentation.
#   check-exports.sh LIBRARY LIST_DIR [NM [PLATFORM_LIBRARY IMPORT_LIST [sanitized]]]
set -euo pipefail
lib=$1
list_dir=$2
nm_tool=${3:-nm}
platform=${4:-}
imports=${5:-}
sanitized=${6:-}

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

[ -n "$platform" ] || exit 0
names() { sed -E -e 's/^[0-9a-fA-F]* *[A-Za-z] +//' -e 's/\(.*$//' | LC_ALL=C sort -u; }
offered=$("$nm_tool" -DC --defined-only "$platform" | names)
taken=$("$nm_tool" -DC --undefined-only "$lib" | names | LC_ALL=C comm -12 - <(echo "$offered"))
[ "$sanitized" = sanitized ] && taken=$(echo "$taken" | { grep -v -E '^typeinfo for ' || true; })
extra=$(LC_ALL=C comm -23 <(echo "$taken") <(sed -e '/^#/d' -e '/^$/d' "$imports" | LC_ALL=C sort -u))
if [ -n "$extra" ]; then
  echo "check-exports: $(basename "$lib") takes from $(basename "$platform") what the platform's list does not hold:" >&2
  echo "$extra" >&2
  exit 1
fi
echo "check-exports: $(echo "$taken" | wc -l) platform imports, all on the list"
