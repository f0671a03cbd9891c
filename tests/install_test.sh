#!/bin/sh
# The installed tool starts from a prefix of its own: it finds libvorcal and libvorsal through
# its RUNPATH ($ORIGIN/../lib), with no library path set.
# usage: install_test.sh CMAKE BUILD_DIR [EMULATOR...]
set -u
cmake=$1 build=$2
shift 2
emu="$*"
tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT
"$cmake" --install "$build" --prefix "$tmp/prefix" > "$tmp/install.log" 2>&1 ||
  { echo "FAIL: cmake --install"; cat "$tmp/install.log"; exit 1; }
ls "$tmp"/prefix/lib*/libvorsal.so.1 > /dev/null 2>&1 || ls "$tmp"/prefix/lib/*/libvorsal.so.1 > /dev/null 2>&1 ||
  { echo "FAIL: no libvorsal.so.1 (versioned SONAME link) installed"; exit 1; }
if ! env -u LD_LIBRARY_PATH $emu "$tmp/prefix/bin/vorcal" --version > "$tmp/out" 2>&1; then
  echo "FAIL: the installed vorcal does not start"; cat "$tmp/out"; exit 1
fi
grep -q '^0x00000001.0x00000001.0x00000002.$' "$tmp/out" || { echo "FAIL: version output"; cat "$tmp/out"; exit 1; }
echo "ok: the installed vorcal starts from $tmp/prefix"
