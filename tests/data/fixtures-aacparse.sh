#!/bin/sh
# Real streams for the whole-frame AAC parser, from ffmpeg's native AAC encoder, with their
# ffprobe sidecar aac/aacparse.txt ("<file> <sample rate> <channels> <packets> <profile>"):
#   aac/tools_44100_2ch.aac    128 kbps stereo, one second of two tones over clicks and noise,
#                              with PNS, intensity stereo, TNS and M/S all on (twoloop coder)
#   aac/main_44100_2ch.aac     AAC Main with prediction (predictor_data in ics_info)
#   aac/surround_48000_6ch.aac 5.1, more channels than the parse-only channel map holds
# and the packet list of the real HE-AAC clip for its AudioSpecificConfig path:
#   aac/bear_v1_aot5.mp4.txt   one "packet POS SIZE" line per access unit of
#                              heaac/bear_v1_aot5.mp4, POS a byte offset into the MP4
# tests/data/heaac/ is a verbatim copy of that clip with its licences (see its README.md).
# Usage: fixtures-aacparse.sh <tests/data dir>
set -eu
data=${1:?usage: fixtures-aacparse.sh <tests/data dir>}
out="$data/aac"
mkdir -p "$out"

# Mono sources merged into stereo: a 440 Hz tone left, 1250 Hz right, and noise with a click
# every 100 ms in both (correlated highs for intensity stereo, noise bands for PNS, transients
# for short windows).
stereo_source() {
  rate=$1 seconds=$2
  shift 2
  ffmpeg -nostdin -hide_banner -loglevel error -y \
    -f lavfi -i "aevalsrc=if(lt(mod(t\,0.1)\,0.0004)\,0.9\,0.02)+(random(0)*2-1)*0.1:s=$rate:c=mono" \
    -f lavfi -i "sine=frequency=440:sample_rate=$rate" -f lavfi -i "sine=frequency=1250:sample_rate=$rate" \
    -filter_complex "[0][1][2]amerge=inputs=3,pan=stereo|c0=0.5*c0+0.6*c1|c1=0.5*c0+0.6*c2,atrim=duration=$seconds" \
    "$@"
}
stereo_source 44100 1 -c:a aac -aac_coder twoloop -aac_pns 1 -aac_is 1 -aac_tns 1 -aac_ms 1 -b:a 128k \
  -f adts "$out/tools_44100_2ch.aac"
stereo_source 44100 0.4 -c:a aac -profile:a aac_main -aac_pred 1 -b:a 64k -f adts "$out/main_44100_2ch.aac"
stereo_source 48000 0.25 -ac 6 -c:a aac -b:a 64k -f adts "$out/surround_48000_6ch.aac"

sidecar="$out/aacparse.txt"
echo "# file sample_rate channels packets profile (ffprobe)" > "$sidecar"
for name in tools_44100_2ch.aac main_44100_2ch.aac surround_48000_6ch.aac; do
  info=$(ffprobe -v error -select_streams a:0 -count_packets \
    -show_entries stream=sample_rate,channels,nb_read_packets,profile -of csv=p=0 "$out/$name")
  # csv order: profile,sample_rate,channels,nb_read_packets
  echo "$name $(echo "$info" | awk -F, '{print $2, $3, $4, $1}')" >> "$sidecar"
done

ffprobe -v error -select_streams a:0 -show_entries packet=pos,size -of compact=p=0 "$data/heaac/bear_v1_aot5.mp4" |
  awk -F'|' '{ delete v; for (i = 1; i <= NF; i++) { split($i, kv, "="); v[kv[1]] = kv[2] } } "pos" in v { print "packet", v["pos"], v["size"] }' \
  > "$out/bear_v1_aot5.mp4.txt"
