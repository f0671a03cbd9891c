#!/bin/sh
# HEVC fixtures (tests/data/hevc/): tiny clips from the libx265 encoder of Debian's ffmpeg.
# Usage: fixtures-hevc.sh <tests/data directory>.
# For every stream S:
#   S.hevc     start-code framed elementary stream (ITU-T H.265 Annex B)
#   S.hvcc     the HEVC decoder configuration record of S remuxed into MP4 (hev1, no box header)
#   S.probe    what ffprobe -show_streams reports on S.hevc ("key=value"), then every syntax
#              element of its first SPS as ffmpeg's trace_headers filter reads it ("sps.NAME=V")
# For the session stream main_176x144 (B pictures, IDR and CRA pictures, 2 slices a picture, two
# temporal sub-layers, access unit delimiters, parameter sets and buffering-period SEI in front of
# every IRAP picture, decoded-picture hash SEI after every picture, HRD parameters in the VUI) also:
#   S.hevc.txt                what ffprobe reports on S.hevc (format below)
#   S.nal, S.nal.txt          the MP4 samples concatenated (4-byte lengths) and their report
#   S.mp4                     the MP4 itself (hev1: parameter sets also inside the samples)
#   S.mp4toannexb.hevc(.txt)  ffmpeg's hevc_mp4toannexb output for the MP4, samples concatenated
# For the decode check, decode_128x96: an MP4 straight from the encoder (hvc1: parameter sets in
# the record only; one slice a picture, B pictures, an MD5 picture hash SEI after every picture):
#   S.mp4, S.hvcc, S.nal, S.nal.txt  the MP4, its record, samples and report
#   S.decode.txt              written only when a build directory is given (below)
# Report format: "width W", "height H", "profile NAME", "level N", "frames N", then one line
# per packet in decode order: "frame OFFSET SIZE PICT_TYPE KEY" (KEY 1 for key packets).
#
# Usage: fixtures-hevc.sh <tests/data directory> [<build directory>]. With a build directory it
# also decodes, with ffmpeg, the Annex B stream the library makes of the decode_128x96 MP4 (the
# record's units, then every sample converted; the test program writes it) and the MP4 itself,
# requires the same frame MD5s and every picture hash SEI verified, and writes the MD5s with the
# size and FNV-1a sum of that stream to S.decode.txt, which CI checks the conversion against.
# `vorcal convert S.mp4 OUT --to annexb` (the tool of the same build) must write that very stream
# and decode to the same frames.
# (The multi-slice pictures of main_176x144 do not decode to their picture hashes in ffmpeg 5.1,
# with or without conversion, so the check uses a single-slice stream.)
set -eu
data=$1
build=${2:-}
out="$data/hevc"
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
mkdir -p "$out"

# report <probe input> <sidecar> [sample list from mp4_extract] [report of the same packets]:
# packets in decode order; a packet whose picture ffprobe does not output (edit-list discards)
# takes its picture type from the other report of the stream.
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

# probe <stream> <sidecar>
probe() {
  ffprobe -v error -select_streams v:0 -show_streams "$1" |
    grep -E '^(width|height|coded_width|coded_height|profile|level|pix_fmt|sample_aspect_ratio|color_range|color_space|color_primaries|color_transfer|r_frame_rate|has_b_frames)=' >"$2"
  ffmpeg -loglevel trace -i "$1" -c copy -bsf:v trace_headers -f null - 2>&1 | python3 -c '
import re, sys
inside = False
for line in sys.stdin:
    if "trace_headers" not in line:
        continue
    if "Sequence Parameter Set" in line:
        inside = True
        continue
    if inside and re.search(r"\] (Picture Parameter Set|Video Parameter Set|Supplemental|Access Unit|Slice|nal_unit_type:)", line):
        break
    m = re.search(r"\]\s+\d+\s+(\w+(?:\[\d+\])*)\s+[01]+ = (-?\d+)$", line.strip())
    if inside and m and not m.group(1).startswith("rbsp_"):
        print("sps.%s=%s" % (m.group(1), m.group(2)))
' >>"$2"
}

# stream <name> <lavfi source with its options, ending in = or :> <size> <frames> <x265 params>
#        <ffmpeg options...>
stream() {
  name=$1 source=$2 size=$3 frames=$4 params=$5
  shift 5
  ffmpeg -y -loglevel error -f lavfi -i "${source}size=$size:rate=25" -frames:v "$frames" "$@" \
    -c:v libx265 -x265-params "log-level=error:info=0:frame-threads=1:pools=none:$params" -f hevc "$out/$name.hevc"
  probe "$out/$name.hevc" "$out/$name.probe"
  ffmpeg -y -loglevel error -r 25 -i "$out/$name.hevc" -c copy -f mp4 "$tmp/$name.mp4"
  python3 "$data/mp4_extract.py" "$tmp/$name.mp4" "$tmp/$name" >"$tmp/$name.samples"
  cp "$tmp/$name.hvcc" "$out/$name.hvcc"
}

# One profile or SPS feature each, 2 pictures (1 for the large one).
stream main_64x48 testsrc2= 64x48 2 crf=40 -pix_fmt yuv420p
stream main10_64x48 testsrc2= 64x48 2 crf=40 -pix_fmt yuv420p10le -color_range pc -colorspace bt709 \
  -color_primaries bt709 -color_trc bt709
# Format range extensions: 4:2:2 10-bit and 4:0:0, with sizes that need a conformance window in
# their own chroma units (SubWidthC 2 and 1, SubHeightC 1).
stream rext422_62x46 testsrc2= 62x46 2 crf=40 -pix_fmt yuv422p10le
stream gray_62x46 testsrc2= 62x46 2 crf=40 -pix_fmt gray
# Sample aspect ratios: one of Table E-1 (16:11, aspect_ratio_idc 4) and one Extended_SAR.
stream sar_64x48 testsrc2= 64x48 2 crf=40 -vf setsar=16/11 -pix_fmt yuv420p
stream extsar_64x48 testsrc2= 64x48 2 crf=40 -vf setsar=7/5 -pix_fmt yuv420p
# A size two luma samples short of the minimum coding block in both directions, flat.
stream conf_1918x1078 color=c=gray: 1918x1078 1 crf=51 -pix_fmt yuv420p

# The session stream.
name=main_176x144
stream $name testsrc2= 176x144 12 \
  keyint=6:min-keyint=6:bframes=2:slices=2:ctu=32:temporal-layers=1:aud=1:repeat-headers=1:hash=2:hrd=1:vbv-maxrate=150:vbv-bufsize=150 \
  -pix_fmt yuv420p -b:v 120k
report "$out/$name.hevc" "$out/$name.hevc.txt"
cp "$tmp/$name.nal" "$tmp/$name.mp4" "$out/"
report "$tmp/$name.mp4" "$out/$name.nal.txt" "$tmp/$name.samples" "$out/$name.hevc.txt"
ffmpeg -y -loglevel error -i "$tmp/$name.mp4" -c copy -bsf:v hevc_mp4toannexb -f hevc "$out/$name.mp4toannexb.hevc"
# Packet sizes of the filter output (framecrc lists them), turned into the same report.
ffmpeg -loglevel error -i "$tmp/$name.mp4" -c copy -bsf:v hevc_mp4toannexb -f framecrc - |
  awk -F', *' '/^0,/ { printf "sample %d %d\n", pos, $5; pos += $5 }' >"$tmp/bsf.samples"
report "$tmp/$name.mp4" "$out/$name.mp4toannexb.hevc.txt" "$tmp/bsf.samples" "$out/$name.hevc.txt"
python3 - "$out/$name.mp4toannexb.hevc.txt" "$tmp/bsf.samples" <<'PY'
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

# The decode check stream.
name=decode_128x96
ffmpeg -y -loglevel error -f lavfi -i "testsrc2=size=128x96:rate=25" -frames:v 12 -pix_fmt yuv420p -c:v libx265 \
  -x265-params "log-level=error:info=0:frame-threads=1:pools=none:keyint=6:min-keyint=6:bframes=2:hash=1" \
  -b:v 100k -tag:v hvc1 -f mp4 "$out/$name.mp4"
cp "$out/$name.mp4" "$tmp/$name.mp4"
python3 "$data/mp4_extract.py" "$tmp/$name.mp4" "$out/$name" >"$tmp/$name.samples"
report "$tmp/$name.mp4" "$out/$name.nal.txt" "$tmp/$name.samples"
if [ -n "$build" ]; then
  HEVC_ANNEXB_OUT="$tmp/converted.hevc" "$build/bin/hevc_fixtures_test" --gtest_also_run_disabled_tests \
    --gtest_filter='Decode.DISABLED_WriteConvertedMp4' | grep '^annexb ' >"$tmp/sum"
  "$build/bin/vorcal" convert "$out/$name.mp4" "$tmp/tool.hevc" --to annexb >/dev/null
  cmp "$tmp/converted.hevc" "$tmp/tool.hevc"
  for f in "$tmp/$name.mp4" "$tmp/converted.hevc" "$tmp/tool.hevc"; do
    # (Probing the raw stream decodes its first picture once more.)
    ffmpeg -loglevel debug -err_detect crccheck -threads 1 -i "$f" -f null - 2>"$tmp/log" >/dev/null
    correct=$(grep -c 'Verifying checksum .*plane 0 - correct.*plane 1 - correct.*plane 2 - correct' "$tmp/log" || true)
    wrong=$(grep -c 'mismatching checksum' "$tmp/log" || true)
    [ "$correct" -ge 12 ] && [ "$wrong" -eq 0 ] || { echo "$f: $correct picture hashes verified, $wrong wrong"; exit 1; }
    ffmpeg -loglevel error -threads 1 -i "$f" -fps_mode passthrough -f framemd5 - | awk -F', *' '/^0,/ { print $NF }' >"$f.md5"
  done
  cmp "$tmp/$name.mp4.md5" "$tmp/converted.hevc.md5"
  cmp "$tmp/$name.mp4.md5" "$tmp/tool.hevc.md5"
  {
    echo "# The Annex B stream made of the MP4 (the library's conversion, and vorcal convert --to annexb"
    echo "# of $name.mp4) decodes with ffmpeg to the MP4's frames (output order)."
    cat "$tmp/sum"
    awk '{ printf "frame %d %s\n", NR - 1, $1 }' "$tmp/$name.mp4.md5"
  } >"$out/$name.decode.txt"
  echo "decode check: 12 frames alike, picture hashes verified"
fi
ls -l "$out"
