#!/bin/sh
# Runs clang-tidy on the sources that changed since a revision (uncommitted changes included).
#   tidy_changed.sh BUILD_DIR [REVISION]
# Without a revision: since the main branch of the origin, or, in a checkout without one, the last commit.
set -eu
build=$1
base=${2:-$(git merge-base HEAD origin/main 2>/dev/null || git rev-parse HEAD)}
files=$( { git diff --name-only --diff-filter=d "$base" -- '*.cpp'; git ls-files -o --exclude-standard -- '*.cpp'; } |
  grep -v -e '_test\.cpp$' -e '^fuzz/' -e '^tests/' -e '/testing/' -e '^otxctl/contract/' | sort -u || true)
if [ -z "$files" ]; then
  echo "clang-tidy: no source changed since $base"
  exit 0
fi
echo "clang-tidy on $(echo "$files" | wc -l) changed file(s)"
plain=$(mktemp -d)
trap 'rm -rf "$plain"' EXIT
python3 -B "$(dirname "$0")/plain_commands.py" "$build" "$plain"
echo "$files" | xargs -P "$(nproc)" -n 1 clang-tidy-14 -p "$plain" --quiet 2>/dev/null
