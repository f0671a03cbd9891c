#!/bin/sh
# Regenerates the real-stream fixtures of tests/data with Debian's ffmpeg and ffprobe
# (apt-get install ffmpeg). CI does not run this: the outputs are committed.
# Each part lives in tests/data/fixtures-*.sh and writes below tests/data.
set -eu
here=$(cd "$(dirname "$0")" && pwd)
command -v ffmpeg >/dev/null || { echo "ffmpeg is needed (apt-get install ffmpeg)"; exit 1; }
for part in "$here"/fixtures-*.sh; do
  [ -f "$part" ] || continue
  echo "== $(basename "$part")"
  sh "$part" "$here"
done
