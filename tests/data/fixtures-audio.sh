#!/bin/sh
# Small real ADTS streams from ffmpeg's native AAC encoder (a 440 Hz tone, 5 frames of 1024
# samples, mono and stereo at rates from 8 kHz to 96 kHz) and their ffprobe sidecar
# audio/adts.txt: "<file> <sample rate> <channels> <frames>" per line.
# Usage: fixtures-audio.sh <tests/data dir>
set -eu
data=${1:?usage: fixtures-audio.sh <tests/data dir>}
out="$data/audio"
mkdir -p "$out"
sidecar="$out/adts.txt"
echo "# file sample_rate channels frames (ffprobe)" > "$sidecar"
for rate in 8000 11025 16000 22050 24000 32000 44100 48000 88200 96000; do
  for ch in 1 2; do
    name="adts-$rate-${ch}ch.aac"
    # 5 * 1024 samples; the encoder adds its priming frame in front.
    samples=5120
    ffmpeg -nostdin -hide_banner -loglevel error -y \
      -f lavfi -i "sine=frequency=440:sample_rate=$rate" -af "atrim=end_sample=$samples" \
      -ac "$ch" -c:a aac -b:a $((ch * 24))k -f adts "$out/$name"
    info=$(ffprobe -v error -select_streams a:0 -count_packets \
      -show_entries stream=sample_rate,channels,nb_read_packets -of csv=p=0 "$out/$name")
    # csv order: sample_rate,channels,nb_read_packets
    echo "$name $(echo "$info" | tr ',' ' ')" >> "$sidecar"
  done
done
