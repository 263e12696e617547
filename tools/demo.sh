#!/bin/sh
# Shows the main job: an agent is started on an example host and asked about its disks.
#   demo.sh BUILD_DIR
set -eu

bin=$1/bin
folder=$(mktemp -d)
agent=
cleanup() {
  [ -z "$agent" ] || kill "$agent" 2>/dev/null || true
  [ -z "$agent" ] || wait "$agent" 2>/dev/null || true
  rm -rf "$folder"
}
trap cleanup EXIT
trap 'exit 130' INT TERM

# Shows a command as it could be typed, then runs it.
show() {
  echo
  echo "\$ $*"
  "$@"
}

PATH=$(cd "$bin" && pwd):$PATH
agentd --listen "unix:$folder/agentd.sock" --ready-file "$folder/ready" --log-level warning &
agent=$!
waited=0
until [ -s "$folder/ready" ]; do
  kill -0 "$agent" 2>/dev/null || { echo "the agent did not start" >&2; exit 1; }
  waited=$((waited + 1))
  [ "$waited" -lt 100 ] || { echo "the agent did not answer in 10 seconds" >&2; exit 1; }
  sleep 0.1
done

echo "An agent serves the example host. Which of its disks can the storage service use?"
show kovactl --agent "unix:$folder/agentd.sock" disks

echo
echo "The same for a real machine with twelve disks, from what lsblk said there, without an agent:"
show kovactl host import examples/hosts/lab-lsblk.json --name lab --write "$folder/lab.json"
show kovactl --host "$folder/lab.json" disks
