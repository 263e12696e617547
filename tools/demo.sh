#!/bin/sh
# Shows the main job: an agent is started on an example host, its disks are added, lost, unmounted and claimed.
#   demo.sh BUILD_DIR
set -eu

PATH=$(cd "$1/bin" && pwd):$PATH
examples=$(cd "$(dirname "$0")/../examples/hosts" && pwd)
folder=$(mktemp -d)
agent=
cleanup() {
  [ -z "$agent" ] || kill "$agent" 2>/dev/null || true
  [ -z "$agent" ] || wait "$agent" 2>/dev/null || true
  rm -rf "$folder"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

say() {
  echo "# $*"
}

# Shows a command as it could be typed, then runs it.
show() {
  echo "\$ $*"
  "$@"
  echo
}

cp "$examples/default.json" "$folder/host.json"
cp "$examples/lab-lsblk.json" "$folder"
cd "$folder"
KOVA_AGENT=unix:$folder/agentd.sock
export KOVA_AGENT
agentd --host host.json --save --listen "$KOVA_AGENT" --ready-file ready --log-level error &
agent=$!
waited=0
until [ -s ready ]; do
  kill -0 "$agent" 2>/dev/null || { echo "the agent did not start" >&2; exit 1; }
  waited=$((waited + 1))
  [ "$waited" -lt 100 ] || { echo "the agent did not answer in 10 seconds" >&2; exit 1; }
  sleep 0.1
done

say "An agent serves an example host. Which of its disks can be used, and why not the others?"
show kovactl disks
say "What would become of them?"
show kovactl plan add --all
say "Every eligible disk is added."
show kovactl add --all --yes
show kovactl groups
say "A disk is lost."
show kovactl sim set naa.5000c50000000204 --absent
show kovactl groups
say "A group is taken out of use, and brought back."
show kovactl unmount naa.5000c50000000101
show kovactl groups
show kovactl claim
show kovactl groups
say "What the agent was asked to change:"
show kovactl tasks
say "The same plan for a real machine with twelve disks, from what lsblk said there, without an agent:"
show kovactl host import lab-lsblk.json --name lab --write lab.json
show kovactl --host lab.json plan add --all
