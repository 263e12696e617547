#!/bin/sh
# Runs every benchmark of a build and prints a table: median of five, and the ratio to its floor. The order is
# mixed, so that what else the machine does at times falls on a benchmark and on its floor alike.
#   run.sh BUILD_DIR [NAME]    all, or NAME_bench only
set -eu
here=$(dirname "$0")
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
for bench in "$1"/bench/${2:-*}_bench; do
  echo "running $(basename "$bench") ..." >&2
  "$bench" --benchmark_repetitions=5 --benchmark_enable_random_interleaving=true \
    --benchmark_report_aggregates_only=true \
    --benchmark_out="$folder/$(basename "$bench").json" --benchmark_out_format=json >/dev/null
done
python3 -B "$here/report.py" "$folder"/*.json
