#!/bin/sh
# The committed generated tables of aacparse/ are what their generators write from
# aacparse/data (the commands of aacparse/data/README.md).
# usage: generated_tables_test.sh PYTHON3 SOURCE_DIR
set -eu
python=$1
cd "$2"
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
fail=0
check() { # generated file, generator, its inputs
  out=$1 generator=$2
  shift 2
  "$python" "aacparse/$generator" "$@" > "$tmp/$out"
  if ! cmp -s "$tmp/$out" "aacparse/$out"; then
    echo "FAIL: aacparse/$out is not what aacparse/$generator writes"
    diff "aacparse/$out" "$tmp/$out" | head -20
    fail=1
  fi
}
check huffman_tables.cpp huffman_gen.py aacparse/data/aac_spectral_codebooks.tsv \
  aacparse/data/aac_scalefactor_codebook.tsv
check sbr_huffman.cpp sbr_huffman_gen.py aacparse/data/sbr_huffman.tsv
check sfb_tables.cpp sfb_tables_gen.py aacparse/data/aac_swb_offsets.tsv
exit $fail
