#!/bin/sh
# Checks the built libvorcal.so: no libstdc++ in NEEDED, undefined symbols limited to the C
# library calls, the vorSAL symbols and compiler plumbing, and exported symbols equal to the
# checked-in lists in abi/exports/*.txt.
# usage: abi_test.sh LIBRARY READELF NM EXPORTS_DIR
set -u
lib=$1 readelf=$2 nm=$3 exports=$4
status=0
tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT

if "$readelf" -d "$lib" | grep NEEDED | grep -q 'libstdc++'; then
  echo "FAIL: libstdc++ is NEEDED"; status=1
fi
"$readelf" -d "$lib" | grep SONAME | grep -q 'libvorcal.so.1' || { echo "FAIL: SONAME is not libvorcal.so.1"; status=1; }

"$nm" -D --undefined-only "$lib" | awk '{print $NF}' | sed 's/@.*//' | sort -u > "$tmp/undefined"
grep -v -E '^(memcpy|memset|strncmp|memmove|memcmp|g_vorSALMemoryTable|g_vorSALFileTable|g_vorSALTraceTable|vorSAL_TraceCat|__cxa_finalize|__stack_chk_fail|__stack_chk_guard|__gmon_start__|_ITM_.*|__aeabi_.*)$' \
  "$tmp/undefined" > "$tmp/unexpected" || true
if [ -s "$tmp/unexpected" ]; then
  echo "FAIL: unexpected undefined symbols:"; cat "$tmp/unexpected"; status=1
fi

"$nm" -D --defined-only "$lib" | awk '{print $NF}' | sed 's/@.*//' | grep -v -E '^(_init|_fini|_edata|_end|__bss_start)$' | sort -u > "$tmp/exported"
cat "$exports"/*.txt | sed 's/#.*//' | tr -d ' \t' | grep -v '^$' | sort -u > "$tmp/expected"
if ! diff "$tmp/expected" "$tmp/exported" > "$tmp/diff"; then
  echo "FAIL: exported symbols differ from abi/exports (< expected only, > exported only):"
  grep '^[<>]' "$tmp/diff"; status=1
fi
[ $status -eq 0 ] && echo "abi: $(wc -l < "$tmp/exported") exports, $(wc -l < "$tmp/undefined") imports as expected"
exit $status
