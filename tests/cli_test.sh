#!/bin/sh
# The vorcal tool end to end: the example engine writes a dump with the library, the tool lists
# and extracts it, and truncated, missing and malformed invocations fail as documented.
# usage: cli_test.sh VORCAL EXAMPLE_ENGINE [EMULATOR...]
set -u
vorcal=$1 engine=$2
shift 2
emu="$*"
tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT
fail=0
check() { # check NAME EXPECTED_STATUS ACTUAL_STATUS
  if [ "$2" != "$3" ]; then echo "FAIL: $1: exit $3, expected $2"; fail=1; else echo "ok: $1"; fi
}

$emu "$engine" "$tmp/frames.dump" > "$tmp/engine.out" 2>&1
check "example engine" 0 $?
$emu "$vorcal" dump "$tmp/frames.dump" > "$tmp/list.out" 2>&1
check "dump lists" 0 $?
grep -q '^4 records' "$tmp/list.out" || { echo "FAIL: expected 4 records"; cat "$tmp/list.out"; fail=1; }
grep -q '^0  *0  *25  *01 42 C0 1E' "$tmp/list.out" || { echo "FAIL: first record line"; fail=1; }

$emu "$vorcal" dump "$tmp/frames.dump" --extract "$tmp/x" > /dev/null 2>&1
check "dump --extract" 0 $?
[ "$(ls "$tmp/x" | wc -l)" -eq 4 ] || { echo "FAIL: 4 extracted files expected"; fail=1; }
[ "$(wc -c < "$tmp/x/record-000000.bin")" -eq 25 ] || { echo "FAIL: record 0 size"; fail=1; }

head -c 40 "$tmp/frames.dump" > "$tmp/cut.dump"
$emu "$vorcal" dump "$tmp/cut.dump" > "$tmp/cut.out" 2> "$tmp/cut.err"
check "truncated record" 1 $?
grep -q 'truncated: record 1 at offset 29 has length 32 but only 7 bytes follow' "$tmp/cut.err" \
  || { echo "FAIL: truncation message"; cat "$tmp/cut.err"; fail=1; }
[ "$(wc -l < "$tmp/cut.err")" -eq 1 ] || { echo "FAIL: one-line error expected"; fail=1; }

$emu "$vorcal" dump "$tmp/missing.dump" > /dev/null 2>&1
check "missing file" 1 $?
$emu "$vorcal" > /dev/null 2>&1
check "no command" 2 $?
$emu "$vorcal" dump > /dev/null 2>&1
check "dump without file" 2 $?
$emu "$vorcal" frobnicate > /dev/null 2> "$tmp/usage.err"
check "unknown command" 2 $?
grep -q 'usage:' "$tmp/usage.err" || { echo "FAIL: usage on stderr"; fail=1; }
$emu "$vorcal" --help > "$tmp/help.out" 2>&1
check "--help" 0 $?
$emu "$vorcal" version > "$tmp/version.out" 2>&1
check "version" 0 $?
grep -q '^0x00000001.0x00000001.0x00000002.$' "$tmp/version.out" || { echo "FAIL: version string"; fail=1; }
exit $fail
