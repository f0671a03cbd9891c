#!/bin/sh
# The vorcal executable end to end where a process matters: the example engine writes a dump with
# the library and the tool lists it from a file, standard input, a pipe and a FIFO; hostile pipes
# and FIFOs end with exit 1, one line on standard error, in bounded time and memory; -v shows the
# layer's traces. The verbs themselves are tested in process by cli_verbs_test.
# usage: cli_test.sh VORCAL EXAMPLE_ENGINE DATA_DIR [EMULATOR...] (VORCAL_TEST_DATA_DIR overrides DATA_DIR)
set -u
vorcal=$1 engine=$2 data=${VORCAL_TEST_DATA_DIR:-$3}
shift 3
emu="$*"
tmp=$(mktemp -d) || exit 1
trap 'rm -rf "$tmp"' EXIT
fail=0
v() { $emu "$vorcal" "$@"; }
# expect NAME STATUS ERROR_TEXT: the last command's status, and for status 1 exactly one line on
# standard error ($tmp/err) that holds the text.
expect() {
  st=$?
  if [ "$st" != "$2" ]; then echo "FAIL: $1: exit $st, expected $2"; cat "$tmp/err"; fail=1; return; fi
  if [ "$2" = 1 ]; then
    if [ "$(wc -l < "$tmp/err")" -ne 1 ] || ! grep -qF -- "$3" "$tmp/err"; then
      echo "FAIL: $1: expected one line with '$3'"; cat "$tmp/err"; fail=1; return
    fi
  fi
  echo "ok: $1"
}

$emu "$engine" "$tmp/frames.dump" > /dev/null 2> "$tmp/err"
expect "example engine" 0
v dump "$tmp/frames.dump" > "$tmp/file.out" 2> "$tmp/err"
expect "dump of a file" 0
grep -q '^4 records, 91 bytes' "$tmp/file.out" || { echo "FAIL: 4 records expected"; fail=1; }
grep -q '^0  *0  *25  *configuration avcC' "$tmp/file.out" || { echo "FAIL: first record line"; fail=1; }

v dump - < "$tmp/frames.dump" > "$tmp/stdin.out" 2> "$tmp/err"
expect "dump of standard input" 0
cat "$tmp/frames.dump" | v dump - > "$tmp/pipe.out" 2> "$tmp/err"
expect "dump of a pipe" 0
cmp -s "$tmp/file.out" "$tmp/stdin.out" && cmp -s "$tmp/file.out" "$tmp/pipe.out" ||
  { echo "FAIL: a pipe lists other records than the file"; fail=1; }

mkfifo "$tmp/fifo"
cat "$tmp/frames.dump" > "$tmp/fifo" &
v dump "$tmp/fifo" > "$tmp/fifo.out" 2> "$tmp/err"
expect "dump of a FIFO" 0
wait
cmp -s "$tmp/file.out" "$tmp/fifo.out" || { echo "FAIL: a FIFO lists other records than the file"; fail=1; }

start=$(date +%s)
v dump --wait 1 "$tmp/fifo" > /dev/null 2> "$tmp/err"
expect "FIFO without a writer" 1 "no writer opened the FIFO within 1 s"
[ $(( $(date +%s) - start )) -le 10 ] || { echo "FAIL: the FIFO wait took too long"; fail=1; }

# A dump over 2 GiB (sparse): offsets past 2^31 on 32-bit targets too.
{ printf '\004\000\000\000ABCD'; printf '\020\000\000\200'; } > "$tmp/big.dump"
truncate -s $((12 + 2147483664)) "$tmp/big.dump"
printf '\002\000\000\000XY' >> "$tmp/big.dump"
v dump "$tmp/big.dump" > "$tmp/big.out" 2> "$tmp/err"
expect "a dump over 2 GiB" 0
grep -q '^2  *2147483676  *2 ' "$tmp/big.out" && grep -q '^3 records, 2147483682 bytes' "$tmp/big.out" ||
  { echo "FAIL: offsets past 2 GiB"; cat "$tmp/big.out"; fail=1; }
rm -f "$tmp/big.dump"

# A length field that lies, from a pipe: read as it comes, never allocated up front.
# The memory limit applies where the tool starts under it (not under qemu or AddressSanitizer).
limit=
[ -z "$emu" ] && sh -c "ulimit -v 200000; $vorcal --version" > /dev/null 2>&1 && limit="ulimit -v 200000;"
sh -c "$limit printf '\\377\\377\\377\\377ABCD' | timeout 20 $emu $vorcal dump -" > /dev/null 2> "$tmp/err"
expect "lying length on a pipe" 1 "truncated: record 0 has length 4294967295 but only 4 bytes follow"
sh -c "$limit printf '\\377\\377\\377\\377ABCD' | timeout 20 $emu $vorcal replay - --codec h264" > /dev/null 2> "$tmp/err"
expect "lying length on a pipe, replayed" 1 "longer than 64 MiB"
head -c 3000000 /dev/zero | tr '\0' '\001' | timeout 20 $emu "$vorcal" probe - > /dev/null 2> "$tmp/err"
expect "3 MB without a start code from a pipe" 1 "unrecognised data"

# Streams from pipes and FIFOs; MP4 needs a seekable file.
v probe - < "$data/audio/adts-44100-2ch.aac" > "$tmp/probe.out" 2> "$tmp/err"
expect "ADTS from standard input" 0
grep -q '^nb_frames=6$' "$tmp/probe.out" || { echo "FAIL: ADTS frame count"; fail=1; }
cat "$data/h264/main_320x180.h264" > "$tmp/fifo" &
v frames "$tmp/fifo" > "$tmp/frames.out" 2> "$tmp/err"
expect "H.264 from a FIFO" 0
wait
grep -q '^# 10 frames, 2 key' "$tmp/frames.out" || { echo "FAIL: H.264 frames from a FIFO"; fail=1; }
v aac - < "$data/heaac/bear_v1_implicit.aac" > "$tmp/aac.out" 2> "$tmp/err"
expect "aac from standard input" 0
grep -q '^62 frames, 23521 bytes, 62 parsed to their exact end$' "$tmp/aac.out" || { echo "FAIL: aac from a pipe"; fail=1; }
cat "$data/h264/high10_64x48.h264" > "$tmp/fifo" &
v sps "$tmp/fifo" > "$tmp/sps.out" 2> "$tmp/err"
expect "sps from a FIFO" 0
wait
grep -q '^# High 10, level 10, 64x48 (coded 64x48), SAR 1:1, yuv420p10le,' "$tmp/sps.out" || { echo "FAIL: sps from a FIFO"; fail=1; }
head -c 70000 /dev/zero | tr '\0' '\021' | v sps - > /dev/null 2> "$tmp/err"
expect "70 kB of 0x11 from a pipe to sps" 1 "too long for parameter-set bytes"
cat "$data/samples/h264_high.mp4" | v probe - > /dev/null 2> "$tmp/err"
expect "MP4 from a pipe" 1 "give a file, not a pipe"

v probe "$tmp" > /dev/null 2> "$tmp/err"
expect "a directory" 1 "is a directory"
if [ "$(id -u)" != 0 ]; then
  cp "$tmp/frames.dump" "$tmp/locked.dump" && chmod 000 "$tmp/locked.dump"
  v dump "$tmp/locked.dump" > /dev/null 2> "$tmp/err"
  expect "an unreadable file" 1 "Permission denied"
fi

v -v replay "$tmp/frames.dump" --wants annexb --strip-ps > /dev/null 2> "$tmp/err"
expect "-v shows the layer's traces" 0
grep -q 'vorsal 16/' "$tmp/err" || { echo "FAIL: no trace line with -v"; fail=1; }
v replay "$tmp/frames.dump" --wants annexb --strip-ps > /dev/null 2> "$tmp/err"
[ ! -s "$tmp/err" ] || { echo "FAIL: traces without -v"; fail=1; }
v --version > "$tmp/version.out" 2> "$tmp/err"
expect "--version" 0
grep -q '^0x00000001.0x00000001.0x00000002.$' "$tmp/version.out" || { echo "FAIL: version string"; fail=1; }
v > /dev/null 2> "$tmp/err"
expect "no verb" 2
exit $fail
