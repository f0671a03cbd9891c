#!/bin/sh
# Runs every libFuzzer binary of a fuzz build for a fixed time, JOBS at a time, seeded with the
# committed corpus (new inputs go to a scratch directory, the committed corpus is not touched).
# Prints the executions of each target; fails when any target finds a crash, leak or timeout.
# usage: run_all.sh BUILD_DIR SECONDS [JOBS]
set -u
build=$1 seconds=$2 jobs=${3:-2}
here=$(cd "$(dirname "$0")" && pwd)
out=$(mktemp -d) || exit 1
targets=$(ls "$build"/bin/*_fuzzer 2>/dev/null)
[ -n "$targets" ] || { echo "no fuzz targets in $build/bin"; exit 1; }
status=0
run_one() {
  name=$(basename "$1")
  mkdir -p "$out/$name.corpus"
  ASAN_OPTIONS=detect_leaks=1 "$1" -max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 \
    -artifact_prefix="$out/$name-" "$out/$name.corpus" "$here/corpus/$name" > "$out/$name.log" 2>&1
  echo $? > "$out/$name.status"
}
set -- $targets
while [ $# -gt 0 ]; do
  n=0
  while [ $# -gt 0 ] && [ $n -lt "$jobs" ]; do
    run_one "$1" &
    shift; n=$((n + 1))
  done
  wait
done
for t in $targets; do
  name=$(basename "$t")
  runs=$(grep -o 'Done [0-9]* runs' "$out/$name.log" | tail -1)
  st=$(cat "$out/$name.status")
  if [ "$st" -ne 0 ]; then
    echo "FAIL: $name (exit $st)"; tail -40 "$out/$name.log"; status=1
  else
    echo "ok: $name: ${runs:-no run count} in ${seconds}s"
  fi
done
rm -rf "$out"
exit $status
