#!/bin/sh
# Runs every fuzz target for some seconds, beginning with its seeds. Ends with the first finding.
#   run.sh BUILD_DIR SECONDS
set -eu
here=$(cd "$(dirname "$0")" && pwd)
build=$(cd "$1" && pwd)
for target in "$build"/fuzz/fuzz_*; do
  [ -x "$target" ] && [ ! -d "$target" ] || continue
  name=$(basename "$target")
  corpus=$build/fuzz/corpus/$name
  mkdir -p "$corpus"
  log=$build/fuzz/$name.log
  # The seed is fixed, so that CI finds today what it found yesterday; the corpus grows between local runs.
  if (cd "$build/fuzz" && "$target" -seed=1 -max_total_time="$2" -rss_limit_mb=4096 -timeout=20 -max_len=65536 \
    -print_final_stats=1 "$corpus" "$here/seeds/$name") >"$log" 2>&1; then
    runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "$log")
    echo "$name: $runs inputs in $2 s, nothing found"
  else
    tail -n 40 "$log" >&2
    echo "$name: a finding; the input is in $build/fuzz, the log in $log" >&2
    exit 1
  fi
done
