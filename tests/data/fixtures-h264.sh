#!/bin/sh
# H.264 fixtures (tests/data/h264/): short synthetic clips from the libx264 encoder of Debian's
# ffmpeg, in both framings. Usage: fixtures-h264.sh <tests/data directory>. For each stream S:
#   S.h264       start-code framed elementary stream (ITU-T H.264 Annex B)
#   S.h264.txt   what ffprobe reports on S.h264 (format below)
#   S.avcc       the AVC decoder configuration record of S remuxed into MP4 (no box header)
#   S.nal        the MP4 samples of S, concatenated: NAL units behind 4-byte lengths
#   S.nal.txt    what ffprobe reports on the MP4, offsets into S.nal
# and for the Main stream also
#   S.mp4toannexb.h264      ffmpeg's h264_mp4toannexb output for the MP4, samples concatenated
#   S.mp4toannexb.h264.txt  the same report, offsets into that file
# Report format: "width W", "height H", "profile NAME", "level N", "frames N", then one line
# per packet in decode order: "frame OFFSET SIZE PICT_TYPE KEY" (KEY 1 for key packets).
set -eu
data=$1
out="$data/h264"
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
mkdir -p "$out"

# report <probe input> <sidecar> [sample list from mp4_extract] [report of the same packets]:
# the sidecar of one stream, packets in decode order; a packet whose picture ffprobe does not
# output (edit-list discards) takes its picture type from the other report of the stream.
report() {
  ffprobe -v error -select_streams v:0 \
    -show_entries stream=width,height,profile,level:packet=pos,size,flags:frame=pkt_pos,pict_type \
    -of json "$1" >"$tmp/probe.json"
  python3 - "$tmp/probe.json" "$2" "${3:-}" "${4:-}" <<'PY'
import json, sys
probe = json.load(open(sys.argv[1]))
s = probe["streams"][0]
items = probe["packets_and_frames"]
packets = [p for p in items if p["type"] == "packet"]
types = {int(f["pkt_pos"]): f["pict_type"] for f in items if f["type"] == "frame" and "pkt_pos" in f}
offsets = [int(l.split()[1]) for l in open(sys.argv[3])] if sys.argv[3] else None
other = [l.split()[3] for l in open(sys.argv[4]) if l.startswith("frame ")] if sys.argv[4] else None
with open(sys.argv[2], "w") as out:
    out.write("width %d\nheight %d\nprofile %s\nlevel %d\nframes %d\n" %
              (s["width"], s["height"], s["profile"], s["level"], len(packets)))
    for i, p in enumerate(packets):
        pos = int(p["pos"])
        t = types.get(pos) or (other[i] if other else "?")
        out.write("frame %d %d %s %d\n" % (offsets[i] if offsets else pos, int(p["size"]), t,
                                            1 if "K" in p["flags"] else 0))
PY
}

# stream <name> <size> <x264 options...>
stream() {
  name=$1 size=$2
  shift 2
  ffmpeg -y -loglevel error -f lavfi -i "testsrc2=size=$size:rate=25" -frames:v 10 -pix_fmt yuv420p \
    -c:v libx264 "$@" -f h264 "$out/$name.h264"
  report "$out/$name.h264" "$out/$name.h264.txt"
  ffmpeg -y -loglevel error -r 25 -i "$out/$name.h264" -c copy -f mp4 "$tmp/$name.mp4"
  python3 "$data/mp4_extract.py" "$tmp/$name.mp4" "$out/$name" >"$tmp/$name.samples"
  report "$tmp/$name.mp4" "$out/$name.nal.txt" "$tmp/$name.samples" "$out/$name.h264.txt"
}

# Baseline: access unit delimiters, one slice per picture, IDR every 4 pictures.
stream baseline_176x144 176x144 -profile:v baseline -level 1.2 -g 4 -x264-params aud=1
# Main: B-pictures, two slices per picture, a height that needs cropping (180 of 192).
stream main_320x180 320x180 -profile:v main -level 2.1 -g 8 -bf 2 -x264-params slices=2

ffmpeg -y -loglevel error -i "$tmp/main_320x180.mp4" -c copy -bsf:v h264_mp4toannexb -f h264 \
  "$out/main_320x180.mp4toannexb.h264"
# Packet sizes of the filter output (framecrc lists them), turned into the same report.
ffmpeg -loglevel error -i "$tmp/main_320x180.mp4" -c copy -bsf:v h264_mp4toannexb -f framecrc - |
  awk -F', *' '/^0,/ { printf "sample %d %d\n", pos, $5; pos += $5 }' >"$tmp/bsf.samples"
report "$tmp/main_320x180.mp4" "$out/main_320x180.mp4toannexb.h264.txt" "$tmp/bsf.samples" \
  "$out/main_320x180.h264.txt"
python3 - "$out/main_320x180.mp4toannexb.h264.txt" "$tmp/bsf.samples" <<'PY'
import sys
# The report took its sizes from the MP4; the filter output has its own.
sizes = [int(l.split()[2]) for l in open(sys.argv[2])]
lines = open(sys.argv[1]).read().splitlines()
i = 0
for n, line in enumerate(lines):
    if line.startswith("frame "):
        f = line.split()
        f[2] = str(sizes[i])
        lines[n] = " ".join(f)
        i += 1
open(sys.argv[1], "w").write("\n".join(lines) + "\n")
PY
ls -l "$out"
