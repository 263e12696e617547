#!/bin/sh
# Runs every benchmark of a build and prints a table: median of five, and the ratio to its floor.
#   run.sh BUILD_DIR
set -eu
here=$(dirname "$0")
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
for bench in "$1"/bench/*_bench; do
  echo "running $(basename "$bench") ..." >&2
  "$bench" --benchmark_repetitions=5 --benchmark_report_aggregates_only=true \
    --benchmark_out="$folder/$(basename "$bench").json" --benchmark_out_format=json >/dev/null
done
python3 -B "$here/report.py" "$folder"/*.json
