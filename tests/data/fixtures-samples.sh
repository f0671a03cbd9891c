#!/bin/sh
# The bundled samples of `make run` and of the vorcal tool's end-to-end tests (tests/data/samples/),
# made with Debian's ffmpeg and described by ffprobe. Usage: fixtures-samples.sh <tests/data dir>.
# Needs a built vorcal tool (VORCAL=path, default build/bin/vorcal) for the AMR sample and for the
# conversion check, and the shared HE-AAC clip (HEAAC_DIR, default ../shared/data/heaac).
#
#   h264_high.mp4      H.264 High, 320x240, 12 frames, B-frames, 3 slices per picture. The picture
#                      is still in its top part, so every sample's first NAL unit is either small
#                      (under 256 bytes) or large (512 and more): no sample starts with a length
#                      field that the documented format test takes for a start code (1, 256-511).
#                      The script checks that, and that `vorcal convert --to annexb` of the MP4
#                      decodes with ffmpeg to exactly the frames of the MP4 (frame MD5s in
#                      h264_high.framemd5.txt; CI compares nothing that needs ffmpeg).
#   h264_misread.mp4   H.264 High, 256x144, 12 frames, 4 slices of moving content: several samples
#                      start with a length in 256-511. h264_misread.txt lists them ("misread N",
#                      found from the samples by mp4_extract.py, not by vorcal) and the frame MD5s
#                      a correct conversion decodes to; the script checks that `vorcal convert
#                      --to annexb --trust-config` decodes to them.
#   aac_lc.m4a         AAC-LC, 44100 Hz stereo, 1 s, in an M4A.
#   mpeg4_asp.m4v      MPEG-4 Visual (Advanced Simple, B-VOPs), 176x144, 10 frames, elementary stream.
#   amr_nb.amr         AMR-NB storage file. Debian's ffmpeg has no AMR encoder, so the frames are
#                      the layer's own silent frames (`vorcal silence`, real AMR-NB frames that
#                      ffmpeg decodes): 20 of frame type 7, 10 of frame type 2, 20 of frame type 7,
#                      so that the frame-type lock has something to substitute.
#   <file>.json        ffprobe -show_streams -show_packets (selected entries) of each file, and
#                      heaac_aot5.json / heaac_implicit.json for the clips in tests/data/heaac/.
set -eu
data=$(cd "${1:?usage: fixtures-samples.sh <tests/data dir>}" && pwd)
out="$data/samples"
vorcal=${VORCAL:-$data/../../build/bin/vorcal}
[ -x "$vorcal" ] || { echo "build the vorcal tool first (make build), or set VORCAL"; exit 1; }
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
mkdir -p "$out" "$data/heaac"

probe() { # probe FILE SIDECAR
  ffprobe -v error -count_packets -of json=compact=1 \
    -show_entries stream=index,codec_type,codec_name,profile,level,width,height,pix_fmt,sample_aspect_ratio,sample_rate,channels,nb_frames,nb_read_packets:packet=pos,size,flags \
    "$1" >"$2"
}

framemd5() { # framemd5 FILE: the MD5 of every decoded frame, one per line
  ffmpeg -v error -i "$1" -f framemd5 - | grep -v '^#' | awk -F', *' '{print $6}'
}

# Indices of the samples whose first 4-byte NAL length is 1 or 256-511.
misread() {
  python3 "$data/mp4_extract.py" "$1" "$tmp/x" | awk '{print $2, $3}' >"$tmp/samples"
  python3 - "$tmp/x.nal" "$tmp/samples" <<'PY'
import struct, sys
nal = open(sys.argv[1], "rb").read()
for i, line in enumerate(open(sys.argv[2])):
    off = int(line.split()[0])
    n = struct.unpack(">I", nal[off:off + 4])[0]
    if n == 1 or 256 <= n <= 511:
        print("misread %d" % i)
PY
}

# H.264 High with a still top third: small or large first slices only.
ffmpeg -v error -y -filter_complex \
  "smptebars=s=320x240:r=25[bg];testsrc2=s=320x96:r=25[fg];[bg][fg]overlay=0:144,format=yuv420p" \
  -frames:v 12 -c:v libx264 -profile:v high -crf 23 -bf 2 -g 8 -x264-params slices=3 \
  -movflags +faststart "$out/h264_high.mp4"
[ -z "$(misread "$out/h264_high.mp4")" ] || { echo "h264_high.mp4: a sample starts like a start code"; exit 1; }
framemd5 "$out/h264_high.mp4" >"$out/h264_high.framemd5.txt"
"$vorcal" convert "$out/h264_high.mp4" "$tmp/high.h264" --to annexb >/dev/null
framemd5 "$tmp/high.h264" | cmp -s - "$out/h264_high.framemd5.txt" ||
  { echo "h264_high.mp4: the converted Annex B stream decodes to other frames"; exit 1; }
probe "$out/h264_high.mp4" "$out/h264_high.mp4.json"

# H.264 High with moving content in every slice.
ffmpeg -v error -y -f lavfi -i "testsrc2=size=256x144:rate=25" -frames:v 12 -pix_fmt yuv420p \
  -c:v libx264 -profile:v high -bf 2 -g 8 -x264-params slices=4 -movflags +faststart "$out/h264_misread.mp4"
{ misread "$out/h264_misread.mp4"; framemd5 "$out/h264_misread.mp4" | sed 's/^/md5 /'; } >"$out/h264_misread.txt"
grep -q '^misread' "$out/h264_misread.txt" || { echo "h264_misread.mp4: no sample is misread"; exit 1; }
"$vorcal" convert "$out/h264_misread.mp4" "$tmp/misread.h264" --to annexb --trust-config >/dev/null
framemd5 "$tmp/misread.h264" | sed 's/^/md5 /' >"$tmp/misread.md5"
grep '^md5' "$out/h264_misread.txt" | cmp -s - "$tmp/misread.md5" ||
  { echo "h264_misread.mp4: the --trust-config conversion decodes to other frames"; exit 1; }
probe "$out/h264_misread.mp4" "$out/h264_misread.mp4.json"

ffmpeg -v error -y -f lavfi -i "sine=frequency=440:duration=1:sample_rate=44100" -ac 2 -c:a aac -b:a 64k \
  -movflags +faststart "$out/aac_lc.m4a"
probe "$out/aac_lc.m4a" "$out/aac_lc.m4a.json"

ffmpeg -v error -y -f lavfi -i "testsrc2=size=176x144:rate=10" -frames:v 10 -pix_fmt yuv420p \
  -c:v mpeg4 -bf 1 -g 5 -q:v 8 -f m4v "$out/mpeg4_asp.m4v"
probe "$out/mpeg4_asp.m4v" "$out/mpeg4_asp.m4v.json"

# AMR-NB from the layer's silent frames; the storage magic comes once.
{
  "$vorcal" silence --codec amrnb --ft 7 --frames 20 -o -
  "$vorcal" silence --codec amrnb --ft 2 --frames 10 -o - | tail -c +7
  "$vorcal" silence --codec amrnb --ft 7 --frames 20 -o - | tail -c +7
} >"$out/amr_nb.amr"
ffmpeg -v error -i "$out/amr_nb.amr" -f null - || { echo "amr_nb.amr does not decode"; exit 1; }
probe "$out/amr_nb.amr" "$out/amr_nb.amr.json"

# The HE-AAC clip of the shared data, byte for byte, with its licence files.
heaac=${HEAAC_DIR:-$data/../../../shared/data/heaac}
for f in README.md bear_v1_aot5.asc bear_v1_aot5.mp4 bear_v1_implicit.aac shaka-packager_LICENSE.txt \
  shaka-packager_chromium-LICENSE.txt; do
  cp "$heaac/$f" "$data/heaac/$f"
  chmod u+w "$data/heaac/$f"
done
probe "$data/heaac/bear_v1_aot5.mp4" "$out/heaac_aot5.json"
probe "$data/heaac/bear_v1_implicit.aac" "$out/heaac_implicit.json"
ls -l "$out" "$data/heaac"
