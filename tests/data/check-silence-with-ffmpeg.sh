#!/bin/sh
# Decodes every silence frame the library produces with Debian's ffmpeg and checks that each
# decodes (exit status 0) to near silence (volumedetect max_volume at or below -60 dB).
# AAC modes 0-4 behind ADTS at several rates; AMR-NB FT 0-7 and AMR-WB FT 0-8 in storage-format
# files; DRA is skipped (ffmpeg has no DRA decoder). CI does not run this.
#
# Known properties of the fixed templates, reported but not failures:
#  - ffmpeg warns about the SBR payload of the SBR templates at some header rates ("Invalid
#    vDk0", "env_facs_q 255 is invalid") and still decodes them to silence;
#  - ffmpeg refuses the one-byte AMR "no data" frame 0x7C (files *-nodata.amr).
#
# Usage: check-silence-with-ffmpeg.sh <build dir>   (a build of this tree with its tests)
set -eu
build=${1:?usage: check-silence-with-ffmpeg.sh <build dir>}
command -v ffmpeg >/dev/null || { echo "ffmpeg is needed (apt-get install ffmpeg)"; exit 2; }
exporter="$build/bin/silence_export_test"
[ -x "$exporter" ] || { echo "no $exporter: build the tests first"; exit 2; }

out=$(mktemp -d)
trap 'rm -rf "$out"' EXIT
VORCAL_SILENCE_DIR="$out" "$exporter" --gtest_also_run_disabled_tests \
  --gtest_filter=SilenceExport.DISABLED_WriteFiles >"$out/export.log" 2>&1 ||
  { cat "$out/export.log"; exit 1; }

failures=0
printf '%-24s %-8s %-11s %s\n' file status max_volume notes
for f in "$out"/*.aac "$out"/*.amr; do
  name=$(basename "$f")
  log="$out/$name.log"
  if ffmpeg -nostdin -hide_banner -loglevel level+info -i "$f" -af volumedetect -f null - >"$log" 2>&1; then
    status=ok
  else
    status="exit$?"
  fi
  peak=$(sed -n 's/.*max_volume: \(.*\) dB/\1/p' "$log" | tail -n 1)
  # Decoder and demuxer complaints; the duration estimate of headerless streams is not one.
  grep -E '\[(warning|error|fatal)\]' "$log" | grep -v 'Estimating duration' >"$log.w" || true
  warnings=$(grep -c . "$log.w" || true)
  first=$(head -n 1 "$log.w" | sed 's/.*\[\(warning\|error\|fatal\)\] //' | cut -c1-50)
  notes=""
  [ "$warnings" -gt 0 ] && notes="$warnings warning line(s): $first"
  case "$name" in
    *-nodata.amr)
      # Expected: the decoder does not accept the empty frame.
      if [ "$status" = ok ] && [ -n "$peak" ]; then notes="accepted $notes"; else notes="refused (expected) $notes"; fi
      ;;
    *)
      if [ "$status" != ok ] || [ -z "$peak" ] || ! awk -v p="$peak" 'BEGIN { exit !(p <= -60) }'; then
        failures=$((failures + 1))
        notes="FAIL $notes"
      fi
      ;;
  esac
  printf '%-24s %-8s %-11s %s\n' "$name" "$status" "${peak:--}" "$notes"
done
echo "DRA: skipped (no DRA decoder in ffmpeg)"
if [ "$failures" -ne 0 ]; then
  echo "$failures file(s) did not decode to silence"
  exit 1
fi
echo "all silence frames decode to silence"
