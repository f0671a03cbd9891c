#!/bin/sh
# Compiles every public header alone, as C99 and as C++20, with warnings as errors.
# usage: header_test.sh CC CXX INCLUDE_DIR
set -u
cc=$1 cxx=$2 inc=$3
tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT
status=0
for header in "$inc"/vorcal/*.h; do
  name=$(basename "$header")
  printf '#include <vorcal/%s>\n#include <vorcal/%s>\nint vorcal_header_test_%s;\n' "$name" "$name" "${name%.h}" > "$tmp/t.c"
  cp "$tmp/t.c" "$tmp/t.cpp"
  if ! "$cc" -std=c99 -Wall -Wextra -pedantic -Werror -I"$inc" -c "$tmp/t.c" -o "$tmp/t.o"; then
    echo "FAIL: $name as C99"; status=1
  fi
  if ! "$cxx" -std=c++20 -Wall -Wextra -pedantic -Werror -I"$inc" -c "$tmp/t.cpp" -o "$tmp/t.o"; then
    echo "FAIL: $name as C++"; status=1
  fi
done
[ $status -eq 0 ] && echo "all public headers compile alone as C99 and C++"
exit $status
