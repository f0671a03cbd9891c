#!/bin/sh
# The C snippet of the README compiles as written and its calls link against the library.
# usage: readme_test.sh CC README INCLUDE_DIR LIBRARY_DIR
set -u
cc=$1 readme=$2 include=$3 libdir=$4
tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT
# The first ```c block.
awk '/^```c$/ { on = 1; next } on && /^```$/ { exit } on { print }' "$readme" > "$tmp/snippet.c"
[ -s "$tmp/snippet.c" ] || { echo "FAIL: no C snippet in $readme"; exit 1; }
$cc -std=c99 -Wall -Wextra -Wno-unused-parameter -pedantic -Werror -fPIC -I"$include" \
  -c "$tmp/snippet.c" -o "$tmp/snippet.o" || { echo "FAIL: the snippet does not compile"; exit 1; }
# Every library name it uses resolves (what the libraries need themselves is not checked here).
$cc -shared -o "$tmp/snippet.so" "$tmp/snippet.o" -L"$libdir" -lvorcal -lvorsal \
  -Wl,--no-undefined -Wl,--unresolved-symbols=ignore-in-shared-libs ||
  { echo "FAIL: the snippet does not link"; exit 1; }
echo "ok: the README snippet compiles and links"
