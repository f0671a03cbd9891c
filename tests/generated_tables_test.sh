#!/bin/sh
# The committed tables of aacparse/ are what their generators write from aacparse/data.
# usage: generated_tables_test.sh PYTHON3 SOURCE_DIR
set -u
python=$1
cd "$2/aacparse" || exit 1
status=0
check() { # table, generator, the generator's inputs
  table=$1 generator=$2
  shift 2
  "$python" "$generator" "$@" | cmp -s - "$table" || { echo "FAIL: aacparse/$table"; status=1; }
}
check huffman_tables.cpp huffman_gen.py data/aac_spectral_codebooks.tsv \
  data/aac_scalefactor_codebook.tsv
check sbr_huffman.cpp sbr_huffman_gen.py data/sbr_huffman.tsv
check sfb_tables.cpp sfb_tables_gen.py data/aac_swb_offsets.tsv
exit $status
