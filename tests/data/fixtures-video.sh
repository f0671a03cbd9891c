#!/bin/sh
# Video classification fixtures: a few frames per codec, encoded with ffmpeg, split into their
# packets and described by ffprobe (see tests/data/video/split.py for the file formats).
# Usage: fixtures-video.sh <tests/data dir>
set -eu
data=$1
out=$data/video
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
mkdir -p "$out"
src="-f lavfi -i testsrc2=rate=10:size=352x288 -frames:v 10"

enc() { # name container size codec-options...
  name=$1; ext=$2; size=$3; shift 3
  ffmpeg -hide_banner -loglevel error -y $src -s "$size" -pix_fmt yuv420p "$@" "$tmp/$name.$ext"
  python3 "$out/split.py" "$tmp/$name.$ext" "$out/$name"
}

enc mpeg4_bf2   mkv 320x240 -c:v mpeg4 -bf 2 -g 6 -q:v 8
enc mpeg4_xvid  mkv 176x144 -c:v libxvid -g 6 -q:v 8
enc h263_qcif   mkv 176x144 -c:v h263 -g 6 -q:v 8
enc h263_cif    mkv 352x288 -c:v h263 -g 6 -q:v 10
enc h263p_320   mkv 320x240 -c:v h263p -g 6 -q:v 8
enc mpeg2       mkv 320x240 -c:v mpeg2video -bf 2 -g 6 -q:v 8
enc wmv1        asf 176x144 -c:v wmv1 -g 6 -q:v 8
enc wmv2        asf 176x144 -c:v wmv2 -g 6 -q:v 8
