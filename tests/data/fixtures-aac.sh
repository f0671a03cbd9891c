#!/bin/sh
# AAC LC ADTS fixtures for the AAC type detection tests: a few frames of a sine tone per rate
# and channel count. File names carry rate and channel count: aac/sine_<rate>_<channels>ch.aac.
# usage: fixtures-aac.sh TESTS_DATA_DIR
set -eu
out="$1/aac"
mkdir -p "$out"
for rate_channels in 44100:1 44100:2 48000:2 22050:1 8000:2; do
  rate=${rate_channels%:*} ch=${rate_channels#*:}
  ffmpeg -hide_banner -loglevel error -y -f lavfi -i "sine=frequency=440:sample_rate=$rate:duration=0.6" \
    -ac "$ch" -c:a aac -b:a 48k -f adts "$out/sine_${rate}_${ch}ch.aac"
done
