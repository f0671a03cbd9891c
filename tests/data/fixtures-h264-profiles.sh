#!/bin/sh
# H.264 fixtures for the full SPS parser and the stream-aware video adaptation
# (tests/data/h264/): tiny clips from the libx264 encoder of Debian's ffmpeg, one per profile
# and per SPS feature. Usage: fixtures-h264-profiles.sh <tests/data directory>.
# For each profile stream S:
#   S.h264    start-code framed elementary stream, 1 or 2 pictures
#   S.avcc    the AVC decoder configuration record of S remuxed into MP4 (no box header)
#   S.probe   what ffprobe -show_streams reports on S.h264 ("key=value"), then every syntax
#             element of its first SPS as ffmpeg's trace_headers filter reads it ("sps.NAME=V")
# For the stream-aware adaptation:
#   trust_160x96.avcc/.nal/.nal.txt   24 MP4 samples (4 slices each, most first units 256-511
#             bytes long, so that they begin 00 00 01 xx), the record, "frame OFFSET SIZE" lines
#   trust_160x96.mp4toannexb.h264(.txt)  ffmpeg's h264_mp4toannexb output for the same samples
#   slices_208x192.h264   one picture of 156 slices, all but the first behind 3-byte start codes
set -eu
data=$1
out="$data/h264"
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
mkdir -p "$out"

# probe <stream> <sidecar>
probe() {
  ffprobe -v error -select_streams v:0 -show_streams "$1" |
    grep -E '^(width|height|coded_width|coded_height|profile|level|pix_fmt|field_order|sample_aspect_ratio|color_range|color_space|color_primaries|color_transfer|r_frame_rate|has_b_frames|bits_per_raw_sample)=' >"$2"
  ffmpeg -loglevel trace -i "$1" -c copy -bsf:v trace_headers -f null - 2>&1 | python3 -c '
import re, sys
inside = False
for line in sys.stdin:
    if "trace_headers" not in line:
        continue
    if "Sequence Parameter Set" in line:
        inside = True
        continue
    if inside and re.search(r"\] (Picture Parameter Set|Supplemental|Access Unit|Slice|Coded)", line):
        break
    m = re.search(r"\]\s+\d+\s+(\w+(?:\[\d+\])*)\s+[01]+ = (-?\d+)$", line.strip())
    if inside and m and not m.group(1).startswith("rbsp_"):
        print("sps.%s=%s" % (m.group(1), m.group(2)))
' >>"$2"
}

# stream <name> <lavfi source with its options, ending in = or :> <size> <frames> <ffmpeg options...>
stream() {
  name=$1 source=$2 size=$3 frames=$4
  shift 4
  ffmpeg -y -loglevel error -f lavfi -i "${source}size=$size:rate=25" -frames:v "$frames" "$@" \
    -f h264 "$out/$name.h264"
  probe "$out/$name.h264" "$out/$name.probe"
  ffmpeg -y -loglevel error -r 25 -i "$out/$name.h264" -c copy -f mp4 "$tmp/$name.mp4"
  python3 "$data/mp4_extract.py" "$tmp/$name.mp4" "$tmp/$name" >/dev/null
  cp "$tmp/$name.avcc" "$out/$name.avcc"
}

x264="-c:v libx264 -crf 40"
stream baseline_64x48 testsrc2= 64x48 2 -pix_fmt yuv420p $x264 -profile:v baseline
stream main_64x48 testsrc2= 64x48 2 -pix_fmt yuv420p $x264 -profile:v main
stream high_64x48 testsrc2= 64x48 2 -pix_fmt yuv420p $x264 -profile:v high
stream high10_64x48 testsrc2= 64x48 2 -pix_fmt yuv420p10le $x264 -profile:v high10
# 4:2:2 and 4:4:4 with sizes that crop in their own chroma units.
stream high422_62x46 testsrc2= 62x46 2 -pix_fmt yuv422p $x264 -profile:v high422
stream high444_62x46 testsrc2= 62x46 2 -pix_fmt yuv444p $x264 -profile:v high444
# Field coding (MBAFF): frame_mbs_only_flag 0, cropped in field units (4 rows a unit).
stream interlaced_64x40 testsrc2= 64x40 2 -pix_fmt yuv420p $x264 -flags +ilme+ildct
# A custom quantisation matrix: x264 sends it in the PPS, the SPS stays without lists.
stream cqm_64x48 testsrc2= 64x48 2 -pix_fmt yuv420p $x264 -x264-params cqm=jvt
# Sample aspect ratios: one of Table E-1 (16:11, aspect_ratio_idc 4), one Extended_SAR.
stream sar_64x48 testsrc2= 64x48 2 -vf setsar=16/11 -pix_fmt yuv420p $x264
stream extsar_64x48 testsrc2= 64x48 2 -vf setsar=7/5 -pix_fmt yuv420p $x264
# A size one luma column and five rows short of macroblocks, flat, one picture.
stream odd_1918x1078 color=c=gray: 1918x1078 1 -pix_fmt yuv420p -c:v libx264 -crf 51
# Full range with a colour description and NAL HRD parameters in the VUI.
stream fullrange_64x48 testsrc2= 64x48 2 -pix_fmt yuvj420p -colorspace bt709 -color_primaries bt709 \
  -color_trc bt709 -c:v libx264 -b:v 100k -maxrate 100k -bufsize 100k -x264-params nal-hrd=vbr

# The stream-aware session: P pictures under a tight rate, 4 slices each (one encoder thread,
# so that the rate control gives the same bytes on every run).
name=trust_160x96
ffmpeg -y -loglevel error -f lavfi -i "testsrc2=size=160x96:rate=25" -frames:v 24 -pix_fmt yuv420p \
  -c:v libx264 -threads 1 -profile:v main -g 24 -bf 0 -b:v 230k -maxrate 230k -bufsize 10k -x264-params slices=4 \
  -f h264 "$tmp/$name.h264"
ffmpeg -y -loglevel error -r 25 -i "$tmp/$name.h264" -c copy -f mp4 "$tmp/$name.mp4"
python3 "$data/mp4_extract.py" "$tmp/$name.mp4" "$out/$name" | awk '{ print "frame", $2, $3 }' >"$out/$name.nal.txt"
ffmpeg -y -loglevel error -i "$tmp/$name.mp4" -c copy -bsf:v h264_mp4toannexb -f h264 \
  "$out/$name.mp4toannexb.h264"
ffmpeg -loglevel error -i "$tmp/$name.mp4" -c copy -bsf:v h264_mp4toannexb -f framecrc - |
  awk -F', *' '/^0,/ { printf "frame %d %d\n", pos, $5; pos += $5 }' >"$out/$name.mp4toannexb.h264.txt"

# One picture of single-macroblock slices: 155 of its start codes are 3 bytes long.
stream slices_208x192 testsrc2= 208x192 1 -pix_fmt yuv420p -c:v libx264 -profile:v baseline -crf 45 \
  -x264-params slice-max-mbs=1
rm -f "$out/slices_208x192.avcc"
ls -l "$out"
